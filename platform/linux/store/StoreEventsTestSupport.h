#pragma once

#include <ostream>
#include <string>
#include <string_view>
#include <sys/xattr.h>
#include <tuple>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/store/StoreTestSupport.h"
#include "platform/services/FileEventService.h"

namespace marrowdale::native {

// How a store comes to know what happened.
enum class Following : std::uint8_t {
    fanotify,
    inotify,
    restart,  // it is closed while things happen
};

inline std::ostream& operator<<(std::ostream& out, Following following) {
    constexpr std::array<const char*, 3> names{"fanotify", "inotify", "restart"};
    return out << names.at(static_cast<std::size_t>(following));
}

// A tag that a document carries: an attribute that is kept when other programs save the document.
inline constexpr const char* tagName = "user.com.quillory.favorite-rank.number#PS";
inline constexpr std::string_view tagValue("a\0tag", 5);

// One event, as text: "gone a", "appeared folder/b", "renamed to", "changed c", with " (did=N)" for
// a document that is gone with it.
inline std::string describe(const StoredEvent& event) {
    if ((event.flags & FileEventFlag::documentMoved) != 0) {
        return "moved document";
    }
    std::string text;
    const auto add = [&](std::uint32_t flag, const char* word) {
        if ((event.flags & flag) != 0) {
            text += (text.empty() ? "" : "+") + std::string(word);
        }
    };
    add(FileEventFlag::gone, "gone");
    add(FileEventFlag::appeared, "appeared");
    add(FileEventFlag::renamed, "renamed");
    add(FileEventFlag::changed, "changed");
    text += " " + std::string(event.path);
    text += (event.flags & FileEventFlag::isFolder) != 0 ? "/" : "";
    if (event.goneDocument != DocumentID{}) {
        text += " (did=" + std::to_string(raw(event.goneDocument)) + ")";
    }
    return text;
}

// A store that follows a tree in one of the ways, and the events since the last time they were
// asked for.
class StoreEventsTest : public StoreTestBaseOf<std::tuple<TestFileSystem, Following>> {
  protected:
    StoreEventsTest() : StoreTestBaseOf(std::get<0>(GetParam())) {}

    [[nodiscard]] Following following() const { return std::get<1>(GetParam()); }
    [[nodiscard]] bool isLive() const { return following() != Following::restart; }
    [[nodiscard]] StoreOptions options() const override {
        StoreOptions options = StoreTestBaseOf::options();
        if (isLive()) {
            // Batches do not depend on how fast the machine is.
            options.recording = StoreOptions::Recording::whenAsked;
            options.watcher = following() == Following::fanotify ? Watcher::Kind::fanotify
                                                                 : Watcher::Kind::inotify;
        }
        return options;
    }

    // Opens over what was made so far; what comes after it is news.
    void begin() {
        settle();
        open();
        ASSERT_TRUE(store().report().recorder.watcher || !isLive())
            << store().report().recorder.problem;
        last_ = *store().barrier();
        if (!isLive()) {
            close();
        }
    }
    // Between `begin` and the changes, for what needs the store.
    template <typename Use>
    void withStore(const Use& use) {
        if (!isLive()) {
            open();
        }
        use();
        if (!isLive()) {
            close();
        }
    }
    // The events since the last time, and the store knows of everything.
    std::vector<std::string> news() {
        std::vector<std::string> texts;
        withStore([&] {
            const auto now = store().barrier();
            ASSERT_TRUE(now) << now.error().description();
            auto cursor = store().eventsSince(last_);
            ASSERT_TRUE(cursor) << cursor.error().description();
            while (true) {
                const auto event = (*cursor)->next();
                ASSERT_TRUE(event) << event.error().description();
                if (!*event) {
                    break;
                }
                EXPECT_GT((*event)->id, last_);
                last_ = (*event)->id;
                texts.push_back(describe(**event));
            }
            EXPECT_LE(last_, *now);
            last_ = *now;
        });
        return texts;
    }
    // The same without what may be told once more: a file that was still being written, or that was
    // looked at within a clock tick of its last change.
    std::vector<std::string> newsOnce() {
        std::vector<std::string> texts = news();
        std::vector<std::string> once;
        for (const std::string& text : texts) {
            const bool isAgain =
                text.starts_with("changed ") &&
                std::ranges::find(once, "appeared " + text.substr(8)) != once.end();
            if (!isAgain && std::ranges::find(once, text) == once.end()) {
                once.push_back(text);
            }
        }
        return once;
    }
    DocumentID documentOf(const std::string& below) {
        DocumentID document{};
        withStore([&] {
            const std::filesystem::path whole(below);
            document = assign(whole.parent_path().string()).at(whole.filename().string());
        });
        return document;
    }
    // False where the file system keeps no tags.
    [[nodiscard]] bool setTag(const std::string& below) const {
        return ::setxattr(path(below).c_str(), tagName, tagValue.data(), tagValue.size(), 0) == 0;
    }
    [[nodiscard]] std::string tagOf(const std::string& below) const {
        std::string value(100, ' ');
        const auto size = ::getxattr(path(below).c_str(), tagName, value.data(), value.size());
        value.resize(size < 0 ? 0 : static_cast<std::size_t>(size));
        return value;
    }
    [[nodiscard]] std::string placeOf(DocumentID document) {
        std::string place;
        withStore([&] { place = pathOf(document); });
        return place;
    }

  private:
    EventID last_{};
};

inline std::string nameOf(
    const testing::TestParamInfo<std::tuple<TestFileSystem, Following>>& info) {
    std::ostringstream name;
    name << std::get<0>(info.param).name << "_" << std::get<1>(info.param);
    return name.str();
}

}  // namespace marrowdale::native
