#pragma once

#include <filesystem>
#include <future>
#include <optional>
#include <string>
#include <utility>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderActions.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "providers/marrowdale/items/AppLibraryOfURL.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/ItemLookup.h"
#include "providers/marrowdale/items/LocalItem.h"
#include "tests/support/AddedLibraries.h"
#include "tests/support/TestWorld.h"

namespace marrowdale {

// When an item went into the trash, as it stands on disk.
inline constexpr const char* trashDateName = "user.com.quillory.trash.time#PS";

// For tests of actions: real folders, with an app library "#org.example.Notes" beside the storage
// root. Paths that begin with "app:" lie in its documents folder.
class ActionsTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    using Item = Expected<FileProviderItemPtr>;

    ActionsTest() {
        makeFolder(directory_.path("app/Documents"));
        addLibrary(world_.platform, world_.applications, "org.example.Notes", "Notes",
                   directory_.path("app"));
    }

    [[nodiscard]] std::string path(std::string_view name) const {
        constexpr std::string_view app = "app:";
        return name.starts_with(app)
                   ? directory_.path("app/Documents/") + std::string(name.substr(app.size()))
                   : world_.path(name);
    }
    [[nodiscard]] URL url(std::string_view name) const { return URL::fileURL(path(name)); }
    [[nodiscard]] std::string made(std::string_view name, std::string_view contents = {}) {
        writeFile(path(name), contents);
        return identifierOf(name);
    }
    [[nodiscard]] std::string madeIn(std::string_view name) {
        makeFolder(path(name));
        return identifierOf(name);
    }
    [[nodiscard]] std::string identifierOf(std::string_view name) {
        return identifierOfItemAt(platform_, url(name)).value_or("none");
    }
    [[nodiscard]] bool exists(std::string_view name) const {
        return std::filesystem::exists(std::filesystem::symlink_status(path(name)));
    }
    [[nodiscard]] bool hasAttributes() const { return keepsUserAttributes(directory_.path()); }

    // Waits for the one answer.
    template <typename Call>
    Item answerTo(const Call& call) {
        std::promise<Item> answer;
        call(ItemCompletionHandler([&](Item item) { answer.set_value(std::move(item)); }));
        return answer.get_future().get();
    }
    template <typename Call>
    std::optional<Error> errorOf(const Call& call) {
        std::promise<std::optional<Error>> answer;
        call(ErrorCompletionHandler(
            [&](const std::optional<Error>& error) { answer.set_value(error); }));
        return answer.get_future().get();
    }

    [[nodiscard]] std::size_t count(const std::string& line) const {
        return world_.sink->count(line);
    }
    [[nodiscard]] std::size_t countContaining(const std::string& text) const {
        return world_.sink->countContaining(text);
    }
    // Whether the log has these texts, each in a later line than the one before.
    [[nodiscard]] bool logHasInOrder(const std::vector<std::string>& texts) const {
        std::size_t next = 0;
        for (const std::string& line : world_.sink->lines()) {
            if (next < texts.size() && line.find(texts[next]) != std::string::npos) {
                ++next;
            }
        }
        return next == texts.size();
    }

    TemporaryDirectory directory_{GetParam().dir};
    TestWorld world_{directory_, {}, TestWorld::Serving::wholeDirectory};
    const Platform& platform_ = world_.platform;
};

// In a test of ActionsTest.
#define MARROWDALE_NEED_ATTRIBUTES()                                 \
    if (!hasAttributes()) {                                          \
        MARROWDALE_SKIP("the file system keeps no user attributes"); \
    }

}  // namespace marrowdale
