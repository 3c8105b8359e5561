#include <cerrno>

#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/actions/ActionsTestWorld.h"
#include "providers/marrowdale/actions/ItemActions.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale {
namespace {

using Operation = FaultInjectingFileOperations::Operation;

class ItemActionsTest : public ActionsTest {
  protected:
    Item import(const std::string& source, std::string_view parent) {
        return answerTo([&](auto handler) {
            importDocument(platform_, URL::fileURL(source), parent, handler);
        });
    }
    Item create(std::string_view name, std::string_view parent) {
        return answerTo([&](auto handler) { createDirectory(platform_, name, parent, handler); });
    }
    Item rename(std::string_view item, std::string_view name) {
        return answerTo([&](auto handler) { renameItem(platform_, item, name, handler); });
    }
    Item move(std::string_view item, std::string_view parent,
              std::optional<std::string> name = std::nullopt) {
        return answerTo(
            [&](auto handler) { reparentItem(platform_, item, parent, name, handler); });
    }
    void answerAll(const Error& error) {
        world_.fileOperations.answer = [error](Operation, const URL&) {
            return std::optional(Expected<URL>(Unexpected(error)));
        };
    }
    const Error refused_ = errorFileWriteNoPermission();
};
INSTANTIATE_TEST_SUITE_P(OnEach, ItemActionsTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(ItemActionsTest, importAnswersTheItemThatIsThereNow) {
    const std::string source = directory_.path("source.txt");
    writeFile(source, "text");
    const std::string folder = madeIn("folder");
    const auto item = import(source, folder);
    ASSERT_TRUE(item) << item.error().description();
    EXPECT_EQ((*item)->filename, "source.txt");
    EXPECT_EQ((*item)->parentItemIdentifier, folder);
    EXPECT_EQ((*item)->documentSize, 4U);
    EXPECT_EQ((*item)->itemIdentifier, identifierOf("folder/source.txt"));
    EXPECT_TRUE(std::filesystem::exists(source));
    EXPECT_EQ(countContaining(" import document at \"" + URL::fileURL(source).absoluteString() +
                              "\" to parent \"" + folder + "\""),
              1U);
    EXPECT_TRUE(logHasInOrder({" import document at ", " fetching URL for \"" + folder + "\""}));
}

TEST_P(ItemActionsTest, anAppLibraryTakesInDocumentsAndFolders) {
    writeFile(directory_.path("source"), "");
    ASSERT_TRUE(import(directory_.path("source"), "#org.example.Notes"));
    const auto folder = create("new", "#org.example.Notes");
    ASSERT_TRUE(folder);
    EXPECT_EQ((*folder)->parentItemIdentifier, "#org.example.Notes");
    EXPECT_TRUE((*folder)->isFolder());
    EXPECT_TRUE(exists("app:source"));
    EXPECT_TRUE(exists("app:new"));
}

TEST_P(ItemActionsTest, theRootTakesInNothing) {
    const std::string item = made("a");
    writeFile(directory_.path("source"), "");
    int asked = 0;
    world_.fileOperations.answer = [&](Operation, const URL&) -> std::optional<Expected<URL>> {
        ++asked;
        return std::nullopt;
    };
    for (const auto& answer :
         {import(directory_.path("source"), VantrelRootContainerItemIdentifier),
          create("new", VantrelRootContainerItemIdentifier),
          move(item, VantrelRootContainerItemIdentifier),
          move("did=4294967295", VantrelRootContainerItemIdentifier)}) {
        ASSERT_FALSE(answer);
        EXPECT_EQ(answer.error(), refused_);
        EXPECT_EQ(answer.error().userInfo, nullptr);
        EXPECT_EQ(answer.error().subject, "");
    }
    EXPECT_EQ(asked, 0);
    EXPECT_FALSE(exists("new"));
}

TEST_P(ItemActionsTest, onlyTheDestinationIsTestedForTheRoot) {
    const std::string folder = madeIn("folder");
    // The platform refuses it; the provider does not.
    EXPECT_EQ(move(VantrelRootContainerItemIdentifier, folder).error().domain, ErrorDomain::posix);
    EXPECT_EQ(rename(VantrelRootContainerItemIdentifier, "other").error().domain,
              ErrorDomain::posix);
    EXPECT_TRUE(exists("folder"));
}

TEST_P(ItemActionsTest, whatDoesNotResolveIsTheLookUpsError) {
    writeFile(directory_.path("source"), "");
    const std::string nothing = "did=4294967295";
    for (const auto& answer : {import(directory_.path("source"), nothing), create("new", nothing),
                               rename(nothing, "new")}) {
        ASSERT_FALSE(answer);
        EXPECT_EQ(answer.error(), errorForNonExistentItem(nothing));
        EXPECT_EQ(answer.error().subject, nothing);
    }
    EXPECT_EQ(countContaining(" fetching URL for \"" + nothing + "\""), 3U);
    EXPECT_EQ(countContaining("can't find URL matching identifier"), 0U);
}

TEST_P(ItemActionsTest, movingLooksForTheParentFirstAndWithoutASection) {
    const std::string item = made("a");
    const std::string folder = madeIn("folder");
    const auto neither = move("did=4294967295", "fid=999999999");
    ASSERT_FALSE(neither);
    EXPECT_EQ(neither.error(), errorForNonExistentItem(""));
    EXPECT_EQ(neither.error().subject, "fid=999999999");
    EXPECT_EQ(move("did=4294967295", folder).error().subject, "did=4294967295");
    EXPECT_EQ(countContaining(" fetching URL for "), 0U);
    EXPECT_EQ(countContaining(" move item \"did=4294967295\" to parent \"" + folder + "\""), 1U);
}

TEST_P(ItemActionsTest, aMoveKeepsTheNameOrTakesANewOne) {
    const std::string item = made("a", "a");
    const std::string folder = madeIn("folder");
    auto moved = move(item, folder);
    ASSERT_TRUE(moved);
    EXPECT_EQ((*moved)->filename, "a");
    EXPECT_EQ((*moved)->itemIdentifier, item);
    EXPECT_EQ((*moved)->parentItemIdentifier, folder);
    moved = move(item, "#org.example.Notes", "b.txt");
    ASSERT_TRUE(moved);
    EXPECT_EQ((*moved)->filename, "b.txt");
    EXPECT_EQ((*moved)->itemIdentifier, item);
    EXPECT_EQ(readFile(path("app:b.txt")), "a");
}

TEST_P(ItemActionsTest, aRenamedItemKeepsItsIdentifier) {
    const std::string item = made("a");
    const auto renamed = rename(item, "b");
    ASSERT_TRUE(renamed);
    EXPECT_EQ((*renamed)->filename, "b");
    EXPECT_EQ((*renamed)->itemIdentifier, item);
    EXPECT_EQ(countContaining(" rename item \"" + item + "\" to name \"b\""), 1U);
    EXPECT_TRUE(logHasInOrder({" rename item ", " fetching URL for \"" + item + "\""}));
}

TEST_P(ItemActionsTest, aTakenNameIsTheCollisionWithTheItemInTheWay) {
    const std::string item = made("a");
    const std::string sibling = made("b");
    const std::string folder = madeIn("folder");
    const std::string inFolder = made("folder/a");
    writeFile(directory_.path("a"), "");
    for (const auto& [answer, inTheWay] :
         {std::pair(rename(item, "b"), sibling), std::pair(move(item, folder), inFolder),
          std::pair(create("a", folder), inFolder),
          std::pair(import(directory_.path("a"), folder), inFolder)}) {
        ASSERT_FALSE(answer);
        EXPECT_EQ(answer.error().domain, ErrorDomain::fileProvider);
        EXPECT_EQ(answer.error().code, static_cast<int>(FileProviderErrorCode::filenameCollision));
        const auto* info = dynamic_cast<const CollidingItemInfo*>(answer.error().userInfo.get());
        ASSERT_NE(info, nullptr);
        EXPECT_EQ(info->item->itemIdentifier, inTheWay);
    }
}

TEST_P(ItemActionsTest, aCollisionWithoutAnItemStaysThePlatformsError) {
    const std::string item = made("a");
    // What is in the way is served to nobody.
    answerAll(errorFileExists("rename", URL::fileURL(directory_.path("elsewhere"))));
    const auto renamed = rename(item, "b");
    ASSERT_FALSE(renamed);
    EXPECT_EQ(renamed.error().domain, ErrorDomain::file);
    EXPECT_TRUE(collidingURLOf(renamed.error()));
    EXPECT_EQ(countContaining("[ERROR] identifier lookup failed for URL \""), 1U);
}

TEST_P(ItemActionsTest, otherErrorsOfThePlatformReachTheHostUnchanged) {
    const std::string item = made("a");
    const std::string folder = madeIn("folder");
    const Error without{ErrorDomain::file, static_cast<int>(FileErrorCode::fileExists), {}, {}};
    for (const Error& error : {without, errorWithPOSIXCode(ENOSPC, "import", "x")}) {
        answerAll(error);
        for (const auto& answer :
             {rename(item, "b"), move(item, folder), create("b", folder), import("/x", folder)}) {
            ASSERT_FALSE(answer);
            EXPECT_EQ(answer.error(), error);
            EXPECT_EQ(answer.error().subject, error.subject);
        }
    }
}

TEST_P(ItemActionsTest, whatCanNotBecomeAnItemIsTheLookUpsErrorAndStays) {
    const std::string folder = madeIn("folder");
    const std::string item = made("a");
    // A folder of that name belongs to applications alone.
    const auto created = create("Documents", folder);
    ASSERT_FALSE(created);
    EXPECT_EQ(created.error(), errorWithProviderCode(ProviderErrorCode::invalidItemURL, ""));
    EXPECT_TRUE(exists("folder/Documents"));
    EXPECT_EQ(count("[ERROR] identifier lookup failed for URL \"" +
                    url("folder/Documents").absoluteString() + "\""),
              1U);
}

TEST_P(ItemActionsTest, theSectionClosesBeforeTheAnswer) {
    const std::string folder = madeIn("folder");
    FileOperations::URLHandler kept;
    class Keeping final : public ForwardingFileOperations {
      public:
        Keeping(FileOperations& target, FileOperations::URLHandler& kept)
            : ForwardingFileOperations(target), kept_(kept) {}
        void createSubfolder(const URL&, std::string_view, URLHandler handler) override {
            kept_ = std::move(handler);
        }

      private:
        FileOperations::URLHandler& kept_;
    } keeping(world_.fileOperations, kept);
    const Platform platform = withFileOperations(platform_, keeping);
    bool answered = false;
    createDirectory(platform, "new", folder, [&](const Item&) { answered = true; });
    EXPECT_FALSE(answered);
    EXPECT_TRUE(
        logHasInOrder({" create directory with name \"new\" in parent \"" + folder + "\""}));
    EXPECT_TRUE(world_.sink->lines().back().starts_with("[DEBUG] ┗"));
    kept(Unexpected(errorWithPOSIXCode(EIO)));
    EXPECT_TRUE(answered);
}

}  // namespace
}  // namespace marrowdale
