#pragma once

#include <fcntl.h>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "platform/linux/events/Watcher.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/UniqueFD.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {

// A hint that outlives its call.
struct KeptHint {
    std::uint32_t what = 0;
    FileID folder{};
    std::string name;
    FileID file{};
    FileID fromFolder{};
    std::string fromName;
    std::uint32_t fingerprint = 0;
};

inline void PrintTo(const KeptHint& hint, std::ostream* stream) {
    *stream << "{bits " << hint.what << ", folder " << raw(hint.folder) << " \"" << hint.name
            << "\", file " << raw(hint.file) << ", from " << raw(hint.fromFolder) << " \""
            << hint.fromName << "\"}";
}

struct Told {
    std::vector<KeptHint> hints;
    bool overflowed = false;
    std::uint64_t events = 0;

    [[nodiscard]] bool has(FileID folder, std::string_view name, std::uint32_t bits) const {
        std::uint32_t what = 0;
        for (const KeptHint& hint : hints) {
            what |= hint.folder == folder && hint.name == name ? hint.what : 0U;
        }
        return (what & bits) == bits;
    }
    [[nodiscard]] bool names(FileID folder) const {
        for (const KeptHint& hint : hints) {
            if (hint.folder == folder) {
                return true;
            }
        }
        return false;
    }
};

inline Told drainAll(Watcher& watcher) {
    Told told;
    const auto drained = watcher.drain([&](const WatchHint& hint) {
        told.hints.push_back({hint.what, hint.folder, std::string(hint.name), hint.file,
                              hint.fromFolder, std::string(hint.fromName), hint.fingerprint});
    });
    if (!drained) {
        throw std::runtime_error(drained.error().description());
    }
    told.overflowed = drained->overflowed;
    told.events = drained->events;
    return told;
}

// A fresh folder on a file system, and a watcher of a kind that listens to what the test names.
class WatcherWorld {
  public:
    WatcherWorld(const std::string& parent, Watcher::Kind kind)
        : folder_(parent), watcher_(make(folder_.path(), kind)) {}

    [[nodiscard]] std::string at(std::string_view name) const { return folder_.path(name); }
    [[nodiscard]] Watcher& watcher() { return *watcher_; }

    [[nodiscard]] FileID numberOf(std::string_view name) const {
        const auto status = statEntry(AT_FDCWD, at(name).c_str());
        if (!status) {
            throw std::runtime_error(status.error().description());
        }
        return status->fileID;
    }
    // Makes the folder, watches it and answers its number.
    FileID madeAndWatched(std::string_view name) {
        makeFolder(at(name));
        return watch(name);
    }
    FileID watch(std::string_view name) {
        const auto watched = watcher_->watchFolder(open(name, O_PATH).get(), numberOf(name));
        EXPECT_TRUE(watched) << watched.error().description();
        return numberOf(name);
    }
    FileID watchRoot(std::string_view name) {
        const auto watched = watcher_->watchRoot(open(name, O_PATH).get(), numberOf(name));
        EXPECT_TRUE(watched) << watched.error().description();
        return numberOf(name);
    }
    [[nodiscard]] Told drain() { return drainAll(*watcher_); }

    [[nodiscard]] UniqueFD open(std::string_view name, int flags) const {
        UniqueFD opened(::open(at(name).c_str(), flags | O_CLOEXEC));
        EXPECT_TRUE(opened) << name;
        return opened;
    }

  private:
    static std::unique_ptr<Watcher> make(const std::string& path, Watcher::Kind kind) {
        const UniqueFD folder(::open(path.c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
        auto made = makeWatcher(folder.get(), kind);
        if (!made) {
            throw std::runtime_error(made.error().description());
        }
        return std::move(*made);
    }

    TemporaryDirectory folder_;
    std::unique_ptr<Watcher> watcher_;
};

using WatcherParam = std::tuple<TestFileSystem, Watcher::Kind>;

inline std::string kindName(Watcher::Kind kind) {
    return kind == Watcher::Kind::fanotify ? "fanotify" : "inotify";
}

inline constexpr auto watcherParamName = [](const auto& info) {
    const testing::TestParamInfo<TestFileSystem> fileSystem(std::get<0>(info.param), info.index);
    return testFileSystemName(fileSystem) + "_" + kindName(std::get<1>(info.param));
};

// The base of tests that run for each kind on each file system.
class OnEachWatcher : public testing::TestWithParam<WatcherParam> {
  protected:
    [[nodiscard]] static Watcher::Kind kind() { return std::get<1>(GetParam()); }

    WatcherWorld world_{std::get<0>(GetParam()).dir, kind()};
};

inline auto eachWatcher() {
    return testing::Combine(testing::ValuesIn(testFileSystems()),
                            testing::Values(Watcher::Kind::fanotify, Watcher::Kind::inotify));
}

}  // namespace marrowdale::native
