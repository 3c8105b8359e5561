"""The service under test: one process after another over the same home, and what it is asked."""

import http.client
import json
import os
import signal
import socket
import subprocess
import time
import urllib.parse

ROOT = "VantrelRootContainerItemIdentifier"
WORKING_SET = "VantrelWorkingSetContainerItemIdentifier"
PATIENCE = 60  # seconds that an answer may take
LOGS_KEPT = 25


class Refused(Exception):
    """An error that the service answered: {"name", "code", "message", …}."""

    def __init__(self, error):
        super().__init__(json.dumps(error))
        self.name, self.code = error.get("name"), error.get("code")


class Connection(http.client.HTTPConnection):
    def __init__(self, path):
        super().__init__("marrowdale", timeout=PATIENCE)
        self.path = path

    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(self.timeout)
        self.sock.connect(self.path)


class Client:
    """Asks over the socket, by one connection that it makes anew when the last one broke."""

    def __init__(self, path):
        self.path, self.connection = path, None

    def request(self, method, target, body=None):
        """What only asks is asked again where the connection is one of a service that is gone."""
        was_open = self.connection is not None
        try:
            if self.connection is None:
                self.connection = Connection(self.path)
            self.connection.request(method, target, body)
            answer = self.connection.getresponse()
            return answer, answer.read()
        except Exception as error:
            if self.connection is not None:
                self.connection.close()
            self.connection = None
            if was_open and method == "GET" and isinstance(error, (ConnectionError, http.client.HTTPException)):
                return self.request(method, target)
            raise

    def get(self, target):
        _, body = self.request("GET", "/v1/" + target)
        value = json.loads(body)
        if "error" in value:
            raise Refused(value["error"])
        return value

    def act(self, **action):
        answer, body = self.request("POST", "/v1/actions", json.dumps(action))
        if answer.status != 200:
            raise Refused(json.loads(body)["error"])
        kind = None
        for line in body.decode().splitlines():
            if line.startswith("event: "):
                kind = line[7:]
            elif line.startswith("data: ") and kind == "failed":
                value = json.loads(line[6:])
                raise Refused(value.get("error", value))
            elif line.startswith("data: ") and kind == "done":
                return json.loads(line[6:])
        raise ConnectionError("an action without an end")


def quoted(identifier):
    return urllib.parse.quote(identifier, safe="")


def children(client, container):
    """Every item of a container, page after page."""
    items, page = [], ""
    while True:
        answer = client.get(f"items/{quoted(container)}/children{page}")
        items += answer["items"]
        if answer["nextPage"] is None:
            return items
        page = "?page=" + urllib.parse.quote(answer["nextPage"], safe="")


class Service:
    def __init__(self, programs, home, log):
        self.home, self.log = home, open(log, "ab")
        self.verbose = os.environ.get("MARROWDALE_SOAK_VERBOSE")  # the folder for logs, if any
        self.command = [programs + "/bin/marrowdale", "--json"] + (["--verbose"] if self.verbose else []) + ["serve", "--no-browser"]
        self.state = home + "/.local/state/marrowdale"
        self.socket = self.state + "/socket"
        self.clock = home + "/clock"
        with open(self.clock, "wb") as clock:
            clock.write(bytes(8))
        self.environment = {
            "HOME": home,
            "PATH": os.environ["PATH"],
            "TZ": "UTC",
            "LD_PRELOAD": programs + "/lib/marrowdale_clock_shift.so",
            "MARROWDALE_CLOCK_SHIFT": self.clock,
        }
        self.process = None
        self.starts, self.kills = 0, 0
        self.slowest_start = 0.0

    def start(self):
        """Returns when it answers."""
        begun = time.monotonic()
        if self.verbose:
            self.begin_log()
        self.process = subprocess.Popen(
            self.command, env=self.environment, stdout=subprocess.PIPE, stderr=self.log, cwd="/"
        )
        if not self.process.stdout.readline():
            raise RuntimeError(f"the service did not start: it ended with {self.process.wait()}")
        self.starts += 1
        self.slowest_start = max(self.slowest_start, time.monotonic() - begun)

    def begin_log(self):
        """One for each start, and the last ones kept."""
        self.log.close()
        self.log = open(f"{self.verbose}/{self.starts:04}.log", "ab")
        old = f"{self.verbose}/{self.starts - LOGS_KEPT:04}.log"
        if os.path.exists(old):
            os.unlink(old)

    def kill(self):
        self.process.send_signal(signal.SIGKILL)
        self.process.wait()
        self.kills += 1

    def end(self):
        self.process.send_signal(signal.SIGTERM)
        try:
            code = self.process.wait(PATIENCE)
        except subprocess.TimeoutExpired:
            raise RuntimeError("the service did not end when it was asked to") from None
        if code != 0:
            raise RuntimeError(f"the service ended with {code}")

    def is_alive(self):
        return self.process is not None and self.process.poll() is None

    def client(self):
        return Client(self.socket)

    def shift_clock(self, seconds):
        with open(self.clock, "r+b") as clock:
            clock.write((seconds * 10**9).to_bytes(8, "little", signed=True))

    def usage(self):
        """What the process has of the machine, or None while there is none."""
        try:
            folder = f"/proc/{self.process.pid}"
            with open(folder + "/status") as status:
                fields = dict(line.rstrip("\n").split(":", 1) for line in status)
            marks = 0
            descriptors = os.listdir(folder + "/fd")
            for name in os.listdir(folder + "/fdinfo"):
                with open(f"{folder}/fdinfo/{name}", errors="replace") as info:
                    marks += sum(line.startswith(("fanotify ino:", "inotify wd:")) for line in info)
            return {
                "memory": int(fields["VmRSS"].split()[0]) / 1024,
                "descriptors": len(descriptors),
                "threads": int(fields["Threads"]),
                "marks": marks,
                "store": self.store_size() / 2**20,
            }
        except (OSError, KeyError, AttributeError):
            return None

    def store_size(self):
        size = 0
        for folder, _, names in os.walk(self.state):
            for name in names:
                try:
                    size += os.lstat(os.path.join(folder, name)).st_blocks * 512
                except OSError:
                    pass
        return size
