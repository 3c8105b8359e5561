#!/usr/bin/env python3
"""Refuses an include that goes against the direction of the layers.

usage: check-includes.py [--top FOLDER]     ends with 1 and one line for each violation
       check-includes.py --self-test        plants violations and sees that each is found

Who may include what of ours is in LAYERS; who may include the system's headers and other people's
libraries is in SYSTEM and LIBRARIES. The C++ standard library is everybody's. The longest folder
that holds a file decides; a file in no folder of LAYERS is a violation.
"""

import os
import re
import sys
import tempfile
from pathlib import Path

# The interfaces that the extension and everything above it may see.
INTERFACES = ["platform/foundation", "platform/hostframework", "platform/services",
              "platform/Platform.h", "platform/SharedObjects.h"]
FILES = ["platform/linux/files"]
LINUX = ["platform/linux"]
ITEMS = ["providers/marrowdale/items"]
EXTENSION = ["providers/marrowdale"]
EVERYTHING = ["platform", "providers", "host", "tests", "benchmarks", "fuzz"]

LAYERS = {
    "platform/foundation": [],
    "platform/services": ["platform/foundation"],
    "platform/hostframework": ["platform/foundation"],
    "platform/Platform.h": INTERFACES,
    "platform/SharedObjects.h": [],
    "providers/marrowdale/items": INTERFACES,
    "providers/marrowdale/fs": INTERFACES + ITEMS,
    "providers/marrowdale/actions": INTERFACES + ITEMS + ["providers/marrowdale/fs"],
    "providers/marrowdale/apps": INTERFACES + ITEMS,
    "providers/marrowdale/thumbnails": INTERFACES,
    "providers/marrowdale": INTERFACES + EXTENSION,
    "platform/linux/files": ["platform/foundation", "platform/services"],
    "platform/linux/events": ["platform/foundation", "platform/services"] + FILES,
    "platform/linux/store": ["platform/foundation", "platform/services"] + FILES
                            + ["platform/linux/events"],
    "platform/linux/streams": ["platform/foundation", "platform/services"] + FILES
                              + ["platform/linux/store"],
    "platform/linux/operations": ["platform/foundation", "platform/services"] + FILES
                                 + ["platform/linux/store"],
    "platform/linux/applications": ["platform/foundation", "platform/services"] + FILES,
    "platform/linux/icons": ["platform/foundation", "platform/services"] + FILES,
    # The module is reached through its entry point, so the host knows the extension's interfaces
    # and never its classes. The codes of its errors are part of what it answers.
    "host/requests": INTERFACES + FILES + ["providers/marrowdale/items/ProviderError.h"],
    "host/client": INTERFACES + ["host/requests"],
    "client": INTERFACES + ["host/requests", "host/client"],
    "host": INTERFACES + LINUX + ["providers/marrowdale/items/ProviderError.h"],
    # The interface between the two halves of platform/linux has a double that the tests of both use.
    "platform/testing": INTERFACES + ["platform/linux/files/DocumentIndex.h",
                                      "platform/linux/files/EntryStatus.h"],
    "tests": EVERYTHING,
    "benchmarks": EVERYTHING,
    "fuzz": EVERYTHING,
}

# Tests beside the code use what platform/testing offers, and the real services below them; those of
# the extension take them as one test world.
TESTS_OF = {
    "providers/marrowdale": [*LINUX, "tests/support"],
    "platform/linux": INTERFACES,
    "host": ["host/testing", "platform/linux", "platform/hostframework"],
}

# The files outside SYSTEM and LIBRARIES that may include one of their headers, with the reason.
EXCEPTIONS = {
    # What somebody else writes, who has the library installed.
    "client/example/follow.cpp": {"marrowdale/client.h"},
    "client/example/icons.cpp": {"marrowdale/client.h"},
}

SYSTEM = ["platform/linux", "platform/testing", "host", "tests", "benchmarks", "fuzz"]
LIBRARIES = ["platform/linux", "host", "tests", "benchmarks", "fuzz"]

STANDARD = set("""
algorithm any array atomic barrier bit bitset cassert cctype cerrno cfenv cfloat charconv chrono
cinttypes climits clocale cmath codecvt compare complex concepts condition_variable coroutine
csetjmp csignal cstdarg cstddef cstdint cstdio cstdlib cstring ctime cuchar cwchar cwctype deque
exception execution expected filesystem format forward_list fstream functional future initializer_list
iomanip ios iosfwd iostream istream iterator latch limits list locale map memory memory_resource
mutex new numbers numeric optional ostream queue random ranges ratio regex scoped_allocator semaphore
set shared_mutex source_location span spanstream sstream stack stacktrace stdexcept stop_token
streambuf string string_view strstream syncstream system_error thread tuple type_traits typeindex
typeinfo unordered_map unordered_set utility valarray variant vector version
""".split())

TEST_FRAMEWORK = ("gtest/", "gmock/")
INCLUDE = re.compile(r'^\s*#\s*(?:include|include_next|import)\s*(?:([<"])([^>"]+)[>"]|(\S+))')
SYSTEM_HEADER = re.compile(r"^(sys|linux|asm|asm-generic|arpa|net|netinet|bits)/|^[a-z0-9_]+\.h$")


def within(path, places):
    return any(path == place or path.startswith(place + "/") for place in places)


def layer_of(path):
    """The longest entry of LAYERS that holds the file."""
    return max((layer for layer in LAYERS if within(path, [layer])), key=len, default=None)


def is_test(path):
    """Tests, and what the tests of one folder share: ItemTest.cpp, FilesTestWorld.h."""
    return bool(re.search(r"[A-Za-z0-9]Test([A-Z][A-Za-z]*)?\.(cpp|h)$", path))


def allowed_places(path, layer):
    places = [layer, *LAYERS[layer]]
    if is_test(path):
        places.append("platform/testing")
        for folder, more in TESTS_OF.items():
            if within(path, [folder]):
                places += more
    return places


def complaint(path, layer, bracket, header):
    """What is wrong with one include, or None."""
    if header is None:
        return "an include by macro can't be judged"
    if bracket == '"':
        if within(header, allowed_places(path, layer)):
            return None
        return f'"{header}" is not below {layer}'
    if header in STANDARD:
        return None
    if header.startswith(TEST_FRAMEWORK):
        allowed = is_test(path) or within(path, ["tests", "platform/testing"])
        return None if allowed else f"<{header}> belongs to tests"
    if SYSTEM_HEADER.match(header):
        allowed = is_test(path) or within(path, SYSTEM) or header in EXCEPTIONS.get(path, {})
        return None if allowed else f"<{header}> is a header of the system"
    allowed = within(path, LIBRARIES) or header in EXCEPTIONS.get(path, {})
    return None if allowed else f"<{header}> is no header of the standard library"


def check_text(path, text):
    layer = layer_of(path)
    if layer is None:
        return [f"{path}:1: no layer is named for this folder in tools/check-includes.py"]
    found = []
    for number, line in enumerate(text.splitlines(), start=1):
        match = INCLUDE.match(line)
        if match:
            wrong = complaint(path, layer, match[1], match[2])
            if wrong:
                found.append(f"{path}:{number}: {wrong}")
    return found


def sources(top):
    """All sources below `top`, whether git knows them or not; what was built is left out."""
    for folder, folders, files in os.walk(top):
        folders[:] = [name for name in folders
                      if not name.startswith(".") and name not in ("build", "node_modules")]
        for name in files:
            if name.endswith((".h", ".cpp")):
                yield os.path.relpath(os.path.join(folder, name), top)


def check(top):
    found = []
    for name in sorted(sources(top)):
        found += check_text(name, (Path(top) / name).read_text(encoding="utf-8"))
    return found


SELF_TEST = [
    # path, line, whether it is a violation
    ("platform/foundation/URL.cpp", '#include "platform/services/FileSystem.h"', True),
    ("platform/foundation/URL.cpp", '#include "platform/foundation/Data.h"', False),
    ("platform/foundation/URL.cpp", "#include <vector>", False),
    ("platform/foundation/URL.cpp", "#include <unistd.h>", True),
    ("platform/foundation/URL.cpp", "#include <fmt/format.h>", True),
    ("platform/services/FileSystem.h", '#include "platform/hostframework/FileProviderItem.h"', True),
    ("platform/services/FileSystem.h", '#include "platform/Platform.h"', True),
    ("platform/hostframework/A.h", '#include "platform/services/FileSystem.h"', True),
    ("providers/marrowdale/items/LocalItem.cpp", '#include "platform/Platform.h"', False),
    ("providers/marrowdale/items/LocalItem.cpp", '#include "platform/linux/files/UniqueFD.h"', True),
    ("providers/marrowdale/items/LocalItem.cpp", "#include <sys/stat.h>", True),
    ("providers/marrowdale/items/LocalItem.cpp", "#include <cerrno>", False),
    ("providers/marrowdale/items/LocalItem.cpp", "  #  include <nlohmann/json.hpp>", True),
    ("providers/marrowdale/items/LocalItem.cpp", '#include "providers/marrowdale/fs/FSChangeToken.h"', True),
    ("providers/marrowdale/items/LocalItem.cpp", '#include "providers/marrowdale/LocalFileEnumerator.h"', True),
    ("providers/marrowdale/fs/A.cpp", '#include "providers/marrowdale/items/LocalItem.h"', False),
    ("providers/marrowdale/fs/A.cpp", '#include "providers/marrowdale/LocalFileEnumerator.h"', True),
    ("providers/marrowdale/fs/ATest.cpp", '#include "tests/support/TestWorld.h"', False),
    ("providers/marrowdale/LocalFileEnumerator.cpp", '#include "providers/marrowdale/fs/FSChangeToken.h"', False),
    ("providers/marrowdale/LocalFileEnumerator.cpp", '#include "providers/marrowdale/items/LocalItem.h"', False),
    ("providers/marrowdale/items/LocalItemTest.cpp", '#include "platform/linux/files/UniqueFD.h"', False),
    ("providers/marrowdale/items/LocalItemTest.cpp", '#include "host/daemon/World.h"', True),
    ("providers/marrowdale/items/LocalItemTest.cpp", '#include "tests/support/TestWorld.h"', False),
    ("providers/marrowdale/items/LocalItem.cpp", '#include "tests/support/TestWorld.h"', True),
    ("platform/linux/files/A.cpp", '#include "platform/linux/store/B.h"', True),
    ("platform/linux/files/A.cpp", '#include "platform/hostframework/FileProviderItem.h"', True),
    ("platform/linux/files/A.cpp", '#include "providers/marrowdale/items/LocalItem.h"', True),
    ("platform/linux/store/A.cpp", '#include "platform/linux/files/UniqueFD.h"', False),
    ("platform/linux/store/A.cpp", '#include "platform/testing/TestFiles.h"', True),
    ("platform/linux/store/ATest.cpp", '#include "platform/testing/TestFiles.h"', False),
    ("platform/linux/store/StoreTestWorld.h", '#include "platform/testing/TestFiles.h"', False),
    ("platform/linux/store/Testament.h", '#include "platform/testing/TestFiles.h"', True),
    ("platform/testing/FakeIndex.h", '#include "platform/linux/store/Store.h"', True),
    ("platform/linux/store/A.cpp", "#include <sys/mman.h>", False),
    ("host/daemon/World.cpp", '#include "platform/linux/store/A.h"', False),
    ("host/daemon/World.cpp", '#include "providers/marrowdale/items/LocalItem.h"', True),
    ("host/daemon/World.cpp", '#include "platform/testing/TestFiles.h"', True),
    ("host/daemon/World.cpp", "#include <gtest/gtest.h>", True),
    ("host/daemon/World.cpp", "#include HEADER", True),
    ("elsewhere/A.cpp", "", True),
]


def self_test():
    failures = []
    for path, line, wrong in SELF_TEST:
        if bool(check_text(path, line + "\n")) != wrong:
            failures.append(f"{path}: {line}: {'not found' if wrong else 'refused'}")
    # The whole way, from a folder to a line.
    with tempfile.TemporaryDirectory() as top:
        planted = Path(top) / "platform/foundation/Planted.h"
        planted.parent.mkdir(parents=True)
        planted.write_text('#pragma once\n#include "host/A.h"\n', encoding="utf-8")
        if check(top) != ['platform/foundation/Planted.h:2: "host/A.h" is not below '
                          "platform/foundation"]:
            failures.append("a planted file was not found")
    return failures


def main(arguments):
    if arguments == ["--self-test"]:
        found = self_test()
    elif arguments[:1] == ["--top"] and len(arguments) == 2:
        found = check(arguments[1])
    elif not arguments:
        found = check(str(Path(__file__).resolve().parent.parent))
    else:
        print(__doc__, file=sys.stderr)
        return 2
    for line in found:
        print(line)
    return 1 if found else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
