#include <cerrno>
#include <sys/stat.h>

#include "platform/testing/ForwardingExtendedAttributes.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/actions/ActionsTestWorld.h"
#include "providers/marrowdale/actions/TrashActions.h"
#include "providers/marrowdale/items/PutBack.h"

namespace marrowdale {
namespace {

using Operation = FaultInjectingFileOperations::Operation;
constexpr const char* putBackName = "user.com.quillory.trash.putback#PS";

class TrashActionsTest : public ActionsTest {
  protected:
    Item trash(std::string_view item) {
        return answerTo([&](auto handler) { trashItem(platform_, item, handler); });
    }
    Item untrash(std::string_view item, std::optional<std::string> parent = std::nullopt) {
        return answerTo([&](auto handler) { untrashItem(platform_, item, parent, handler); });
    }
    std::optional<Error> remove(std::string_view item) {
        return errorOf([&](auto handler) { deleteItem(platform_, item, handler); });
    }
    void setPutBack(std::string_view name, const std::string& value) {
        const auto bytes = archive(ArchivedObject(value));
        ASSERT_TRUE(bytes);
        setAttribute(path(name), putBackName, bytes->text());
    }
    std::optional<std::string> putBackOf(std::string_view name) {
        const auto data = initWithValueOfXattr(platform_, trashPutBackAttribute, url(name));
        const auto object = data ? unarchivedObject<std::string>(platform_, *data, "test")
                                 : std::unexpected(UnarchiveError::invalidResultingClass);
        return object ? std::optional(*object) : std::nullopt;
    }
};
INSTANTIATE_TEST_SUITE_P(OnEach, TrashActionsTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(TrashActionsTest, aTrashedItemCarriesDateAndPutBack) {
    MARROWDALE_NEED_ATTRIBUTES();
    makeFolder(path("app:Work/inner"));
    const std::string item = made("app:Work/inner/a.txt", "a");
    const Date before = Date::now();
    const auto trashed = trash(item);
    ASSERT_TRUE(trashed) << trashed.error().description();
    EXPECT_TRUE((*trashed)->isTrashed);
    EXPECT_EQ((*trashed)->itemIdentifier, item);
    EXPECT_EQ((*trashed)->fileURL, url("app:.Trash/a.txt"));
    EXPECT_EQ(putBackOf("app:.Trash/a.txt"), "Work/inner/a.txt");
    const auto data = initWithValueOfXattr(platform_, trashDateAttribute, url("app:.Trash/a.txt"));
    const auto date = unarchivedObject<Date>(platform_, *data, "test");
    ASSERT_TRUE(date);
    EXPECT_GE(*date, before);
    EXPECT_LE(*date, Date::now());
    const std::string location = url("app:.Trash/a.txt").absoluteString();
    EXPECT_TRUE(logHasInOrder({" trash item \"" + item + "\"",
                               "[DEBUG] trash is located at \"" + path("app:.Trash") + "\"",
                               "[DEBUG] setting trash date on " + location,
                               "[DEBUG] setting putback string on " + location,
                               "[DEBUG] setting putback 'Work/inner/a.txt' on " + location}));
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_P(TrashActionsTest, theUsersOwnDocumentsHaveNoPutBack) {
    MARROWDALE_NEED_ATTRIBUTES();
    const std::string item = made("a.txt");
    ASSERT_TRUE(trash(item));
    EXPECT_TRUE(attribute(path(".Trash/a.txt"), trashDateName));
    EXPECT_FALSE(attribute(path(".Trash/a.txt"), putBackName));
    EXPECT_EQ(count("[ERROR] couldn't find app library for " + url("a.txt").absoluteString()), 1U);
}

TEST_P(TrashActionsTest, aPutBackThatHasNoStringIsLoggedWithoutTheLastBracket) {
    makeFolder(path("app:inner/Documents"));
    const std::string item = made("app:inner/Documents/a");
    // The same folder by name, once "." is taken out, and other components.
    addLibrary(world_.platform, world_.applications, "org.example.Odd", "Odd", path("app:inner/."));
    const auto library = appLibraryItemHolding(platform_, url("app:inner/Documents/a"));
    ASSERT_TRUE(library);
    ASSERT_EQ(library->itemIdentifier, "#org.example.Odd");
    ASSERT_TRUE(trash(item));
    EXPECT_EQ(count("[ERROR] could't compute putback string (path: " +
                    url("app:inner/Documents/a").absoluteString() +
                    ", basePath: " + library->fileURL.absoluteString()),
              1U);
}

TEST_P(TrashActionsTest, theOutermostDocumentsFolderHasTheTrash) {
    makeFolder(path("sub/Documents"));
    const std::string item = made("sub/Documents/a");
    ASSERT_TRUE(trash(item));
    EXPECT_TRUE(exists(".Trash/a"));
    EXPECT_FALSE(exists("sub/Documents/.Trash"));
}

TEST_P(TrashActionsTest, withoutADocumentsFolderNothingIsTrashed) {
    const URL nowhere = URL::fileURL("/home/u/Files/Documents2/a");
    const auto folder = trashFolderFor(platform_, nowhere);
    ASSERT_FALSE(folder);
    EXPECT_EQ(folder.error(), errorInvalidParameter("sourceURL", ""));
    EXPECT_EQ(folder.error().operation, "sourceURL");
    EXPECT_EQ(folder.error().subject, nowhere.absoluteString());
    EXPECT_EQ(count("[ERROR] no Documents directory found in path \"/home/u/Files/Documents2/a\""),
              1U);
}

TEST_P(TrashActionsTest, componentsThatMakeNoPathMakeNoTrash) {
    EXPECT_EQ(trashURLWithComponents({"/", "home", "Documents", ".Trash"}),
              URL::fileURL("/home/Documents/.Trash"));
    EXPECT_EQ(trashURLWithComponents({}), std::nullopt);
    EXPECT_EQ(trashURLWithComponents({"/", "", ".Trash"}), std::nullopt);
    EXPECT_EQ(trashURLWithComponents({"/", std::string("a\0b", 3), ".Trash"}), std::nullopt);
}

TEST_P(TrashActionsTest, aTrashThatCanNotBeMadeIsThePlatformsError) {
    const std::string item = made("a");
    const Error error = errorWithPOSIXCode(ENOSPC, "make the folder", "x");
    world_.fileSystem.createFault = [&](const URL&) { return error; };
    EXPECT_EQ(trash(item).error(), error);
    EXPECT_TRUE(exists("a"));
}

TEST_P(TrashActionsTest, aTrashThatIsNoFolderIsAnError) {
    const std::string item = made("a");
    makeFolder(directory_.path("elsewhere"));
    std::filesystem::create_directory_symlink(directory_.path("elsewhere"), path(".Trash"));
    EXPECT_FALSE(trash(item));
    EXPECT_TRUE(exists("a"));
    EXPECT_TRUE(std::filesystem::is_empty(directory_.path("elsewhere")));
}

TEST_P(TrashActionsTest, aNameTakenInTheTrashIsAvoided) {
    ASSERT_TRUE(trash(made("a.txt", "1")));
    const auto second = trash(made("a.txt", "2"));
    ASSERT_TRUE(second);
    EXPECT_EQ((*second)->filename, "a 2.txt");
    EXPECT_EQ(readFile(path(".Trash/a.txt")) + readFile(path(".Trash/a 2.txt")), "12");
}

TEST_P(TrashActionsTest, aCollisionThatThePlatformTellsIsTheFrameworks) {
    ASSERT_TRUE(trash(made("a")));
    const std::string inTheWay = identifierOf(".Trash/a");
    const std::string item = made("a");
    world_.fileOperations.answer = [&](Operation, const URL&) {
        return std::optional(Expected<URL>(Unexpected(errorFileExists("move", url(".Trash/a")))));
    };
    for (const auto& answer : {trash(item), untrash(inTheWay, std::string(identifierOf("a")))}) {
        ASSERT_FALSE(answer);
        const auto* info = dynamic_cast<const CollidingItemInfo*>(answer.error().userInfo.get());
        ASSERT_NE(info, nullptr);
        EXPECT_EQ(info->item->itemIdentifier, inTheWay);
    }
}

TEST_P(TrashActionsTest, attributesThatCanNotBeWrittenAreLoggedAlone) {
    const std::string item = made("app:a");
    class Refusing final : public ForwardingExtendedAttributes {
      public:
        using ForwardingExtendedAttributes::ForwardingExtendedAttributes;
        Expected<void> set(const OpenFile&, std::string_view, const Data&) override {
            return Unexpected(errorWithPOSIXCode(ENOSPC));
        }
        Expected<void> remove(const OpenFile&, std::string_view) override {
            return Unexpected(errorWithPOSIXCode(EIO));
        }
    } refusing(world_.attributes);
    const Platform platform = withExtendedAttributes(platform_, refusing);
    auto answer = answerTo([&](auto handler) { trashItem(platform, item, handler); });
    ASSERT_TRUE(answer);
    const std::string location = url("app:.Trash/a").absoluteString();
    EXPECT_EQ(count("[ERROR] can't set xattr com.quillory.trash.time#PS on " + location + "; " +
                    errorWithPOSIXCode(ENOSPC).description()),
              1U);
    EXPECT_EQ(count("[ERROR] couldn't set putback xattr (a) on " + location + "; " +
                    errorWithPOSIXCode(ENOSPC).description()),
              1U);
    answer = answerTo([&](auto handler) { untrashItem(platform, item, std::nullopt, handler); });
    ASSERT_TRUE(answer);
    EXPECT_EQ(count("[ERROR] can't remove xattr com.quillory.trash.time#PS on " +
                    url("app:a").absoluteString() + "; " + errorWithPOSIXCode(EIO).description()),
              1U);
}

TEST_P(TrashActionsTest, aLinkIsTrashedItself) {
    writeFile(directory_.path("outside"), "kept");
    std::filesystem::create_symlink(directory_.path("outside"), path("link"));
    const std::string item = identifierOf("link");
    const auto trashed = trash(item);
    ASSERT_TRUE(trashed) << trashed.error().description();
    EXPECT_TRUE(std::filesystem::is_symlink(path(".Trash/link")));
    EXPECT_EQ(readFile(directory_.path("outside")), "kept");
    EXPECT_EQ(countContaining("[ERROR] can't set xattr com.quillory.trash.time#PS on "), 1U);
    EXPECT_EQ(remove(item), std::nullopt);
    EXPECT_EQ(readFile(directory_.path("outside")), "kept");
}

TEST_P(TrashActionsTest, untrashGoesBackWhereTheItemWas) {
    MARROWDALE_NEED_ATTRIBUTES();
    makeFolder(path("app:Work"));
    const std::string item = made("app:Work/a", "a");
    ASSERT_TRUE(trash(item));
    const auto back = untrash(item);
    ASSERT_TRUE(back) << back.error().description();
    EXPECT_EQ((*back)->fileURL, url("app:Work/a"));
    EXPECT_FALSE((*back)->isTrashed);
    EXPECT_FALSE(attribute(path("app:Work/a"), trashDateName));
    EXPECT_TRUE(attribute(path("app:Work/a"), putBackName));
    EXPECT_TRUE(logHasInOrder(
        {" untrash item \"" + item + "\"", " fetching item's properties for \"" + item + "\"",
         "[DEBUG] putback url is " + url("app:Work").absoluteString(),
         "[DEBUG] removing trash date xattr",
         "[DEBUG] setting trash date on " + url("app:Work/a").absoluteString()}));
}

TEST_P(TrashActionsTest, aPutBackThatIsGoneGivesWayToTheLibrary) {
    MARROWDALE_NEED_ATTRIBUTES();
    for (const char* replacement : {"nothing", "file", "link"}) {
        makeFolder(path("app:Work"));
        const std::string item = made("app:Work/a", "a");
        ASSERT_TRUE(trash(item));
        std::filesystem::remove(path("app:Work"));
        if (std::string_view(replacement) == "file") {
            writeFile(path("app:Work"), "");
        } else if (std::string_view(replacement) == "link") {
            std::filesystem::create_directory_symlink(directory_.path(), path("app:Work"));
        }
        world_.sink->clear();
        const auto back = untrash(item);
        ASSERT_TRUE(back) << back.error().description();
        EXPECT_EQ((*back)->fileURL, url("app:a")) << replacement;
        EXPECT_TRUE(logHasInOrder(
            {"[DEBUG] putback url is not reachable; " + url("app:Work").absoluteString(),
             "[DEBUG] use #org.example.Notes's root as recover location"}));
        std::filesystem::remove_all(path("app:Work"));
        std::filesystem::remove(path("app:a"));
    }
}

TEST_P(TrashActionsTest, aGivenParentComesFirst) {
    makeFolder(path("app:Work"));
    const std::string other = madeIn("app:Other");
    const std::string item = made("app:Work/a");
    ASSERT_TRUE(trash(item));
    const auto back = untrash(item, other);
    ASSERT_TRUE(back);
    EXPECT_EQ((*back)->parentItemIdentifier, other);
}

TEST_P(TrashActionsTest, aTrashedParentIsNotUsed) {
    MARROWDALE_NEED_ATTRIBUTES();
    makeFolder(path("app:Work"));
    const std::string folder = madeIn("app:Other");
    const std::string item = made("app:Work/a");
    ASSERT_TRUE(trash(item));
    ASSERT_TRUE(trash(folder));
    const auto back = untrash(item, folder);
    ASSERT_TRUE(back);
    EXPECT_EQ((*back)->fileURL, url("app:Work/a"));
    EXPECT_EQ(count("[DEBUG] can't use provided parent item " + folder + " because it's trashed; " +
                    path("app:.Trash/Other")),
              1U);
    // One that does not resolve is passed over.
    ASSERT_TRUE(trash(item));
    EXPECT_TRUE(untrash(item, "did=4294967295"));
}

TEST_P(TrashActionsTest, anItemThatIsNotTrashedStays) {
    const std::string item = made("a");
    const auto back = untrash(item);
    ASSERT_FALSE(back);
    EXPECT_EQ(back.error(), errorInvalidParameter("itemIdentifier", item));
    EXPECT_EQ(back.error().operation, "itemIdentifier");
    EXPECT_EQ(back.error().subject, item);
    EXPECT_EQ(count("[DEBUG] item is not in trash"), 1U);
    EXPECT_TRUE(exists("a"));
}

TEST_P(TrashActionsTest, withoutAPlaceTheItemStaysInTheTrash) {
    const std::string item = made("a");
    ASSERT_TRUE(trash(item));
    const auto back = untrash(item);
    ASSERT_FALSE(back);
    EXPECT_EQ(back.error(), errorInvalidParameter("itemIdentifier", item));
    EXPECT_TRUE(logHasInOrder(
        {"[DEBUG] no putback url", "[DEBUG] can't compute valid parent URL for " + item}));
    EXPECT_TRUE(exists(".Trash/a"));
    // The host knows the parent.
    EXPECT_TRUE(untrash(item, std::string(VantrelRootContainerItemIdentifier)));
    EXPECT_TRUE(exists("a"));
}

TEST_P(TrashActionsTest, aNameTakenAtTheOriginIsAvoided) {
    const std::string item = made("app:a.txt", "1");
    ASSERT_TRUE(trash(item));
    writeFile(path("app:a.txt"), "2");
    const auto back = untrash(item);
    ASSERT_TRUE(back);
    EXPECT_EQ((*back)->filename, "a 2.txt");
    EXPECT_EQ((*back)->itemIdentifier, item);
}

TEST_P(TrashActionsTest, aPutBackThatLeadsOutIsNone) {
    MARROWDALE_NEED_ATTRIBUTES();
    for (const std::string& value :
         {std::string("../../x"), std::string("/etc/x"), std::string("Work/../../../x"),
          std::string(), std::string("a//b"), std::string("a\0b", 3), std::string("./x")}) {
        makeFolder(path("app:.Trash"));
        const std::string item = made("app:.Trash/a");
        setPutBack("app:.Trash/a", value);
        world_.sink->clear();
        const auto back = untrash(item);
        ASSERT_TRUE(back) << value;
        EXPECT_EQ((*back)->fileURL, url("app:a")) << value;
        EXPECT_EQ(count("[DEBUG] no putback url"), 1U) << value;
        std::filesystem::remove(path("app:a"));
    }
}

TEST_P(TrashActionsTest, attributesOfAnyBytesDoNoHarm) {
    MARROWDALE_NEED_ATTRIBUTES();
    makeFolder(path("app:.Trash"));
    for (const std::string& bytes :
         {std::string(), std::string("bplist00"), std::string(500, '\xff'),
          archive(ArchivedObject(Number(std::int64_t{5})))->text()}) {
        const std::string item = made("app:.Trash/a");
        setAttribute(path("app:.Trash/a"), putBackName, bytes);
        setAttribute(path("app:.Trash/a"), trashDateName, bytes);
        EXPECT_TRUE(untrash(item));
        EXPECT_TRUE(trash(item));
        EXPECT_EQ(remove(item), std::nullopt);
    }
    EXPECT_GE(countContaining("[ERROR] got OrbNumber while unarchiving object from "), 1U);
}

TEST_P(TrashActionsTest, thePutBackURLIsLookedUpOnceAndCanBeSet) {
    MARROWDALE_NEED_ATTRIBUTES();
    makeFolder(path("app:.Trash"));
    writeFile(path("app:.Trash/a"), "");
    setPutBack("app:.Trash/a", "Work/inner/a");
    const auto item = LocalItem::initWithURL(platform_, url("app:.Trash/a"));
    ASSERT_TRUE(item);
    EXPECT_EQ(item->putBackURL(platform_), url("app:Work/inner"));
    setPutBack("app:.Trash/a", "Other/a");
    EXPECT_EQ(item->putBackURL(platform_), url("app:Work/inner"));
    item->setPutBackURL(url("app:Set"));
    EXPECT_EQ(item->putBackURL(platform_), url("app:Set"));
    item->setPutBackURL(std::nullopt);
    EXPECT_EQ(item->putBackURL(platform_), std::nullopt);
}

TEST_P(TrashActionsTest, deletingAnswersThePlatformsError) {
    makeFolder(path("folder/inner"));
    const std::string item = identifierOf("folder");
    EXPECT_EQ(remove(item), std::nullopt);
    EXPECT_FALSE(exists("folder"));
    EXPECT_EQ(countContaining(" delete item \"" + item + "\""), 1U);
    const std::string file = made("a");
    const Error error = errorWithPOSIXCode(EIO, "remove", "x");
    world_.fileOperations.answer = [&](Operation, const URL&) {
        return std::optional(Expected<URL>(Unexpected(error)));
    };
    EXPECT_EQ(remove(file), error);
    EXPECT_TRUE(exists("a"));
}

TEST_P(TrashActionsTest, whatDoesNotResolveIsTheNonExistentItem) {
    const std::string nothing = "did=4294967295";
    EXPECT_EQ(trash(nothing).error(), errorForNonExistentItem(nothing));
    EXPECT_EQ(untrash(nothing).error(), errorForNonExistentItem(nothing));
    EXPECT_EQ(remove(nothing), errorForNonExistentItem(nothing));
    EXPECT_EQ(countContaining(" fetching URL for "), 0U);
}

TEST_P(TrashActionsTest, thePutBackStringIsMadeOfNames) {
    const auto string = [](const char* item, const char* base) {
        return putBackString(URL::fileURL(item), URL::fileURL(base)).value_or("none");
    };
    EXPECT_EQ(string("/a/Documents/b/c", "/a/Documents"), "b/c");
    EXPECT_EQ(string("/a/Documents", "/a/Documents"), "");
    EXPECT_EQ(string("/a", "/a/Documents"), "none");
    EXPECT_EQ(string("/a/Other/b", "/a/Documents"), "none");
    EXPECT_EQ(string("/a/Documents2/b", "/a/Documents"), "none");
}

}  // namespace
}  // namespace marrowdale
