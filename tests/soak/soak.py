"""One run: rounds of everything at once, and after each a silence in which all pictures must be the same."""

import collections
import json
import os
import random
import sys
import time

import picture
import plot
import service
import trouble
import work

# At the end of a run, for a tree of this size.
MOST_DESCRIPTORS = 256
MOST_THREADS = 80
MOST_MEMORY = 160  # MiB


class Failure(Exception):
    pass


class Soak:
    def __init__(self, programs, home, seed, seconds):
        self.home, self.seconds, self.seed = home, seconds, seed
        self.random = random.Random(seed)
        self.begun = time.monotonic()
        os.makedirs(home + "/Documents", exist_ok=True)
        with open(home + "/outside.bin", "wb") as file:
            file.write(self.random.randbytes(200_000))
        self.service = service.Service(programs, home, home + "/service.log")
        self.applications = work.Applications(home, seed)
        library = self.applications.install("Steady")
        self.applications.enter("Hung")  # where something is mounted that nobody may touch; see run
        self.editor = work.Editor(home + "/Documents/edited", seed + 1)
        self.writers = [
            work.Writer(programs, home + "/Documents", seed + 2),
            work.Writer(programs, home + "/Documents", seed + 3),
            work.Writer(programs, library, seed + 4),
        ]
        self.actors = [work.Actor(self.service, seed + 5 + i, home + "/outside.bin") for i in range(3)]
        self.workers = self.writers + [self.editor, self.applications] + self.actors
        self.troubles = collections.Counter()
        self.starts, self.rounds, self.checked = [], 0, 0
        self.lost, self.taken = [], 0
        self.sampler = work.Sampler(self.service, self.begun)

    def now(self):
        return time.monotonic() - self.begun

    def wait(self, seconds):
        """How long the load or a trouble goes on; no check waits by it: pictures
        are compared when everybody pauses, and a client asks until nothing more comes."""
        time.sleep(seconds)

    def run(self):
        self.service.start()
        self.replica = picture.Replica(self.service.client())
        self.replica.fill()
        self.identifiers = self.edited()
        self.sampler.start()
        while self.now() < self.seconds:
            self.round()
        self.sampler.finish()
        self.expect_bounds()
        self.service.end()

    def round(self):
        self.rounds += 1
        with_applications = self.rounds % 3 == 0
        for worker in self.workers:
            if with_applications or worker is not self.applications:
                worker.start()
        until = self.now() + 6 + self.random.random() * 10
        done = ["applications"] if with_applications else []
        while self.now() < until:
            what = self.random.choice(trouble.ALL)
            done.append(what.__name__)
            self.troubles[what.__name__] += 1
            starts = self.service.starts
            what(self)
            if self.service.starts != starts:
                self.starts.append(self.now())
            self.expect_life()
            if self.random.random() < 0.3:
                self.follow(done, most=5)
        for worker in self.workers:
            if worker.thread is not None:
                worker.finish()
        self.expect_life()
        self.check(done)
        print(f"{self.now():7.0f} s  round {self.rounds}: {', '.join(done)}; "
              f"{self.sampler.entries} entries, all the same", flush=True)

    def expect_life(self):
        if not self.service.is_alive():
            raise Failure(f"the service ended by itself with {self.service.process.returncode}")

    # A follower in the middle of everything need not be right yet, only answered.
    def follow(self, done, most=10**6):
        try:
            self.replica.catch_up(most)
        except service.Refused as refusal:
            # None is lost by a kill, a full queue or disk, a clock, or by applications that come and go.
            raise Failure(f"changes are refused after {done}: {refusal}") from None

    # A store that was set aside would be one reason for whatever else is wrong then.
    def expect_store(self, done):
        damaged = [name for name in os.listdir(self.service.state) if name.startswith("damaged-")]
        if damaged:
            raise Failure(f"the store was set aside as damaged after {done}: {damaged}")

    def edited(self):
        client = self.service.client()
        for name in self.editor.names:
            if not os.path.exists(name):
                self.editor.taken.append(name)
                self.editor.write(name)
        look = lambda name: client.get("lookup?path=" + service.quoted(name))["itemIdentifier"]
        return {name: look(name) for name in self.editor.names}

    def check(self, done):
        self.service.client().request("POST", "/v1/refresh")  # so that all know what applications there are
        self.expect_store(done)
        self.follow(done)
        there = picture.fresh(self.service.client())
        disk = picture.on_disk([self.home + "/Documents"] + self.applications.installed())
        found = picture.disk_differences(there, disk) + self.replica.differences(there)
        self.compare_identifiers(done)
        if found:
            raise Failure("\n".join([f"after {done}:"] + found[:40]))
        self.checked += len(disk)
        self.sampler.entries = len(disk)

    # All of these are told at the end; a run goes on with what the documents are called now.
    def compare_identifiers(self, done):
        now = self.edited()
        for name, identifier in now.items():
            if identifier != self.identifiers[name] and name not in self.editor.taken:
                self.lost.append(f"{os.path.basename(name)} was {self.identifiers[name]} and is {identifier} "
                                 f"after {done}")
        self.identifiers = now
        self.taken += len(self.editor.taken)
        self.editor.taken = []

    def expect_bounds(self):
        if self.lost:
            raise Failure("\n".join(["safe saves took identifiers away:"] + self.lost))
        final = self.sampler.samples[-1][1]
        most = {"descriptors": MOST_DESCRIPTORS, "threads": MOST_THREADS, "memory": MOST_MEMORY}
        for key, bound in most.items():
            if final[key] > bound:
                raise Failure(f"{final[key]} {key} at the end, more than {bound}")

    def summary(self):
        answers = collections.Counter()
        for actor in self.actors:
            answers.update(actor.answers)
        peak = lambda key: max(value[key] for _, value in self.sampler.samples)
        return {
            "seed": self.seed,
            "minutes": round(self.now() / 60, 1),
            "rounds": self.rounds,
            "steps of writers": sum(writer.steps for writer in self.writers),
            "safe saves": self.editor.saves,
            "documents taken by actions on a folder's old number": self.taken,
            "actions done": sum(n for (_, how), n in answers.items() if how == "done"),
            "actions refused": {f"{what} {how}": n for (what, how), n in sorted(answers.items(), key=str)
                                if how != "done"},
            "not in the list of refusals": sorted({line for actor in self.actors for line in actor.unexpected})[:20],
            "applications changed": self.applications.changes,
            "troubles": dict(self.troubles),
            "starts": self.service.starts,
            "slowest start, s": round(self.service.slowest_start, 2),
            "change requests": self.replica.requests,
            "entries compared": self.checked,
            "most memory, MiB": round(peak("memory"), 1),
            "most descriptors": peak("descriptors"),
            "most threads": peak("threads"),
            "most marks": peak("marks"),
            "most store, MiB": round(peak("store"), 1),
        }


def main(programs, home, seed, minutes, image):
    soak = Soak(programs, home, seed, minutes * 60)
    try:
        soak.run()
        result = "1 passed, 0 failed"
    except (Failure, service.Refused, RuntimeError, OSError) as failure:
        print(f"FAILED with seed {seed}: {type(failure).__name__} {failure}", flush=True)
        with open(home + "/actions.log", "w") as log:
            log.write("\n".join(sorted(line for actor in soak.actors for line in actor.done)))
        result = "0 passed, 1 failed"
    if soak.sampler.samples:
        print(json.dumps(soak.summary(), indent=1))
        if image:
            plot.write(image, f"{soak.now() / 60:.0f} minutes of everything at once", soak.sampler.samples,
                       soak.starts)
    print(result, flush=True)
    if soak.service.is_alive():
        soak.service.kill()
    os._exit(0 if result.startswith("1") else 1)  # threads may hang in what failed


if __name__ == "__main__":
    main(sys.argv[1], sys.argv[2], int(sys.argv[3]), float(sys.argv[4]), sys.argv[5] if len(sys.argv) > 5 else "")
