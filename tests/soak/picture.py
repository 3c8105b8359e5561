"""What there is, three times: as a client knows it that goes by changes, as a fresh enumeration tells it, and as it is on disk."""

import os
import stat
import urllib.parse

import service

# Safe saves give these a second name for a moment. Known: of a document with several names, the others are not always
# told when one goes.
LINK = "inode/symlink"
PACKAGES = ("appdir", "bundle", "package", "textbundle", "ufo")


def facts(item):
    """What a client is told of an item and can compare: a folder's own dates and counts change without a word."""
    known = [item["filename"], item["parentItemIdentifier"], item["path"], item["typeIdentifier"]]
    if item["itemIdentifier"].startswith("did="):
        known.append(item.get("documentSize"))
    return tuple(known)


def fresh(client):
    """Lists of items by identifier: a document may have several names. Libraries themselves are left out."""
    found, folders, seen = {}, [service.ROOT], set()
    while folders:
        folder = folders.pop()
        if folder in seen:
            continue
        seen.add(folder)
        for item in service.children(client, folder):
            if item["isFolder"]:
                folders.append(item["itemIdentifier"])
            if not item["itemIdentifier"].startswith("#"):
                found.setdefault(item["itemIdentifier"], []).append(item)
    return found


class Replica:
    def __init__(self, client):
        self.client, self.items, self.anchor = client, {}, None
        self.told = {}
        self.requests = 0

    def fill(self):
        anchor = self.client.get(f"items/{service.WORKING_SET}/anchor")["anchor"]
        self.items = {identifier: items[-1] for identifier, items in fresh(self.client).items()}
        self.anchor, self.told = anchor, {}

    def catch_up(self, most=10**6):
        """Asks for changes until nothing more comes, but `most` times; raises Refused where the anchor is expired."""
        for _ in range(most):
            since = urllib.parse.quote(self.anchor, safe="")
            answer = self.client.get(f"items/{service.WORKING_SET}/changes?since={since}")
            self.requests += 1
            self.apply(answer)
            if answer["moreComing"] and answer["anchor"] == self.anchor:
                raise RuntimeError("more is coming, but the anchor stays")
            self.anchor = answer["anchor"]
            if not answer["moreComing"]:
                return

    def apply(self, answer):
        for identifier in answer["deleted"]:
            self.note(identifier, "deleted")
            self.remove(identifier)
            same = [k for k, item in self.items.items() if f"fid={item.get('fileID')}" == identifier]
            for known in same:
                self.note(known, "deleted as " + identifier)
                self.remove(known)
        for item in answer["updated"]:
            if not item["itemIdentifier"].startswith("#"):
                self.note(item["itemIdentifier"], f"updated: {facts(item)}")
                self.items[item["itemIdentifier"]] = item

    # What was in a folder, or in a library, goes with it. Libraries themselves are not kept here.
    def remove(self, identifier):
        was_known = self.items.pop(identifier, None) is not None or identifier.startswith("#")
        if not was_known or identifier.startswith("did="):
            return
        for known in [k for k, i in self.items.items() if i["parentItemIdentifier"] == identifier]:
            self.note(known, "deleted with " + identifier)
            self.remove(known)

    def note(self, identifier, line):
        self.told.setdefault(identifier, []).append(f"request {self.requests}: {line}")
        del self.told[identifier][:-8]

    def differences(self, there):
        found = []
        for identifier, items in there.items():
            if items[0]["typeIdentifier"] == LINK:
                continue
            known = self.items.get(identifier)
            if known is None:
                found.append(f"missing: {identifier} {facts(items[0])}")
            elif facts(known) not in [facts(item) for item in items]:
                found.append(f"{identifier} known as {facts(known)}, is {facts(items[0])}")
            else:
                continue
            found += ["    " + line for line in self.told.get(identifier, [])]
        for identifier in self.items.keys() - there.keys():
            if self.items[identifier]["typeIdentifier"] == LINK:
                continue
            found.append(f"too much: {identifier} {facts(self.items[identifier])}")
            found += ["    " + line for line in self.told.get(identifier, [])]
        return found


def shown(path):
    """A path as the service writes it: what is no valid UTF-8 stands as low surrogates, here too."""
    return os.fsdecode(path)


def on_disk(roots):
    """Size by path (None but for files) of everything below the roots that is to be served."""
    found = {}
    for root in roots:
        device = os.stat(root).st_dev
        folders = [root]
        while folders:
            with os.scandir(folders.pop()) as entries:
                for entry in entries:
                    status = entry.stat(follow_symlinks=False)
                    if entry.name.startswith(".") or status.st_dev != device:
                        continue
                    if entry.is_symlink() and not os.path.exists(entry.path):
                        continue
                    is_package = entry.name.rpartition(".")[2].lower() in PACKAGES and "." in entry.name
                    if stat.S_ISDIR(status.st_mode) and not is_package:
                        folders.append(entry.path)
                    found[shown(entry.path)] = status.st_size if stat.S_ISREG(status.st_mode) else None
    return found


def disk_differences(there, disk):
    listed = {item["path"]: item for items in there.values() for item in items}
    found = [f"not listed: {path!r}" for path in disk.keys() - listed.keys()]
    found += [f"listed, not there: {path!r}" for path in listed.keys() - disk.keys()]
    for path in disk.keys() & listed.keys():
        size = listed[path].get("documentSize")
        if disk[path] is not None and size != disk[path]:
            found.append(f"size of {path!r}: {size}, is {disk[path]}")
    return found
