"""Those who use the trees all the time: writers, editors, clients that act, applications that come and go.

Each is a thread that does one short thing after another until its `stop` is set, and can be started again.
"""

import collections
import errno
import os
import random
import subprocess
import threading
import time

import service

# What an action may be answered while everything under it changes, disks fill up and rights go.
REFUSALS = ("noSuchItem", "filenameCollision", "writeNoPermission", "invalidParameter")
ERRNOS = {
    errno.ENOENT, errno.ENOSPC, errno.EACCES, errno.EPERM, errno.ENOTDIR, errno.EISDIR, errno.EEXIST,
    errno.ENOTEMPTY, errno.EXDEV, errno.EBUSY, errno.ESTALE, errno.ELOOP, errno.EINVAL, errno.ENODATA,
    errno.EOPNOTSUPP,  # attributes of links
}


class Refused404(service.Refused):
    def __init__(self, identifier):
        super().__init__({"name": "noSuchItem", "message": identifier + " is another item now"})


class Worker:
    def __init__(self, seed):
        self.random = random.Random(seed)
        self.stop = threading.Event()
        self.thread, self.failure = None, None

    def start(self):
        self.stop.clear()
        self.thread = threading.Thread(target=self.run, daemon=True)
        self.thread.start()

    def finish(self):
        self.stop.set()
        self.thread.join(service.PATIENCE * 2)
        if self.thread.is_alive():
            raise RuntimeError(f"{type(self).__name__} does not come to an end")
        if self.failure is not None:
            raise self.failure

    def run(self):
        try:
            while not self.stop.is_set():
                self.step()
        except Exception as failure:  # told where the thread is joined
            self.failure = failure

    def step(self):
        raise NotImplementedError


class Writer(Worker):
    """Random steps by the program made for it, in short bursts with pauses as short."""

    def __init__(self, programs, root, seed):
        super().__init__(seed)
        self.process = subprocess.Popen(
            [programs + "/bin/marrowdale_soak_writer", root, str(seed)],
            stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True,
        )
        self.steps = 0

    def step(self):
        steps = self.random.randrange(1, 200)
        self.process.stdin.write(f"{steps}\n")
        self.process.stdin.flush()
        if not self.process.stdout.readline():
            raise RuntimeError("the writer is gone")
        self.steps += steps
        self.stop.wait(0.1 + self.random.random() * 0.6)


class Editor(Worker):
    """Saves a few documents over and over as programs do. Their identifiers stay."""

    def __init__(self, folder, seed):
        super().__init__(seed)
        os.makedirs(folder, exist_ok=True)
        self.names = [f"{folder}/document {i}.txt" for i in range(8)]
        for name in self.names:
            self.write(name)
        self.saves, self.taken = 0, []

    def write(self, path):
        with open(path, "w") as file:
            file.write("x" * self.random.randrange(1, 5000))

    # One that fails, because the disk is full, leaves the document as it was, as programs do.
    def step(self):
        name = self.random.choice(self.names)
        temporary = f"{os.path.dirname(name)}/.save-{self.random.randrange(10**6)}"
        keeps_backup = self.random.random() < 0.5
        try:
            if not os.path.exists(name):  # somebody acted on a folder whose number it has by now
                self.taken.append(name)
                self.write(name)
            self.write(temporary)
            if keeps_backup:
                os.rename(name, name + "~")
            os.rename(temporary, name)
            self.saves += 1
        except OSError as error:
            if error.errno != errno.ENOSPC:
                raise
            if not os.path.exists(name) and os.path.exists(name + "~"):
                os.rename(name + "~", name)
            if os.path.exists(temporary):
                os.unlink(temporary)
        if os.path.exists(name + "~"):
            os.unlink(name + "~")
        self.stop.wait(self.random.random() * 0.1)


class Actor(Worker):
    """A client that does what can be done to whatever it finds, over the socket or by the command."""

    def __init__(self, served, seed, outside):
        super().__init__(seed)
        self.service, self.client = served, served.client()
        self.outside = outside
        self.answers = collections.Counter()
        self.unexpected = []
        self.known = []
        self.done = collections.deque(maxlen=400)

    def look(self):
        items = service.children(self.client, service.ROOT)
        for _ in range(3):
            folders = [i for i in items if i["isFolder"] and i["filename"] != "edited"]
            if folders:
                items += service.children(self.client, self.random.choice(folders)["itemIdentifier"])
        self.known = [i for i in items if i["filename"] != "edited" and not i["itemIdentifier"].startswith("#")]

    def action(self):
        item = self.random.choice(self.known)["itemIdentifier"]
        folders = [i["itemIdentifier"] for i in self.known if i["isFolder"]] or [item]
        parent, name = self.random.choice(folders), f"made {self.random.randrange(50)}"
        return self.random.choice([
            {"action": "import", "path": self.outside, "parent": parent},
            {"action": "import", "path": self.outside, "parent": parent},
            {"action": "create", "name": name, "parent": parent},
            {"action": "rename", "item": item, "name": name},
            {"action": "move", "item": item, "parent": parent},
            {"action": "trash", "item": item},
            {"action": "delete", "item": item},
            {"action": "tag", "item": item, "tags": ["red", name]},
            {"action": "favorite", "item": item, "rank": self.random.randrange(1000)},
            {"action": "used", "item": item},
        ])

    def look_again(self, action):
        """A folder's number may be another thing's by now; a careful client looks before it acts."""
        identifier = action.get("item", "")
        if identifier.startswith("fid="):
            now = self.client.get("items/" + service.quoted(identifier))
            if now["itemIdentifier"] != identifier:
                raise Refused404(identifier)

    def remember(self, action, answer):
        places = [i["path"] for i in self.known if i["itemIdentifier"] == action.get("item")]
        self.done.append(f"{time.time():.3f} {action}, known at {places}: {answer.get('path')}")

    def untrash(self):
        trashed = [i for i in service.children(self.client, service.WORKING_SET) if i.get("isTrashed")]
        if trashed:
            item = self.random.choice(trashed)["itemIdentifier"]
            self.client.act(action="untrash", item=item, parent=self.random.choice(self.known)["itemIdentifier"])

    def step(self):
        what = "look"
        try:
            if not self.known or self.random.random() < 0.1:
                self.look()
            if self.random.random() < 0.03:
                what = "untrash"
                self.untrash()
            elif self.known:
                action = self.action()
                what = action["action"]
                self.look_again(action)
                self.remember(action, self.client.act(**action))
            self.answers[what, "done"] += 1
        except service.Refused as refusal:
            self.note(what, refusal)
        except OSError:
            self.answers[what, "no answer"] += 1  # the service is being killed or stopped
            self.stop.wait(0.05)
        except Exception as error:
            if not isinstance(error, (service.http.client.HTTPException, ValueError)):
                raise
            self.answers[what, "no answer"] += 1
        self.stop.wait(self.random.random() * 0.02)

    def note(self, what, refusal):
        name = refusal.name if refusal.name != "posix" else errno.errorcode.get(refusal.code, refusal.code)
        self.answers[what, name] += 1
        is_known = refusal.name in REFUSALS or (refusal.name == "posix" and refusal.code in ERRNOS)
        if not is_known and not (refusal.name == "syncAnchorExpired" and what in ("look", "untrash")):
            self.unexpected.append(f"{what}: {refusal}")


class Applications(Worker):
    """Installs and removes applications, whose documents come and go with them."""

    def __init__(self, home, seed):
        super().__init__(seed)
        self.home, self.changes = home, 0

    def entry(self, name):
        return f"{self.home}/.local/share/applications/org.soak.{name}.desktop"

    def install(self, name):
        library = f"{self.home}/.var/app/org.soak.{name}/Documents"
        os.makedirs(library, exist_ok=True)
        self.enter(name)
        return library

    def enter(self, name):
        os.makedirs(os.path.dirname(self.entry(name)), exist_ok=True)
        with open(self.entry(name) + ".new", "w") as file:
            file.write(f"[Desktop Entry]\nType=Application\nName={name}\nX-KvSupportsDocumentBrowser=true\n")
        os.rename(self.entry(name) + ".new", self.entry(name))

    def step(self):
        name = f"Guest{self.random.randrange(4)}"
        try:
            if os.path.exists(self.entry(name)):
                os.unlink(self.entry(name))
            else:
                with open(self.install(name) + f"/{self.random.randrange(5)}.txt", "w") as file:
                    file.write(name)
            self.changes += 1
        except OSError as error:
            if error.errno != errno.ENOSPC:
                raise
        self.stop.wait(0.5 + self.random.random() * 4)

    def installed(self):
        names = ["Steady"] + [f"Guest{i}" for i in range(4)]
        return [f"{self.home}/.var/app/org.soak.{n}/Documents" for n in names if os.path.exists(self.entry(n))]


class Sampler(Worker):
    def __init__(self, served, begun):
        super().__init__(0)
        self.service, self.begun = served, begun
        self.samples, self.entries = [], None

    def step(self):
        usage = self.service.usage()
        if usage is not None:
            usage["entries"] = self.entries
            self.samples.append((time.monotonic() - self.begun, usage))
        self.stop.wait(1)
