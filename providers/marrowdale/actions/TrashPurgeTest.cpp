#include <cerrno>
#include <future>

#include "platform/testing/ForwardingExtendedAttributes.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/actions/ActionsTestWorld.h"
#include "providers/marrowdale/actions/TrashPurge.h"
#include "providers/marrowdale/items/ItemMetadata.h"

namespace marrowdale {
namespace {

using Operation = FaultInjectingFileOperations::Operation;

class TrashPurgeTest : public ActionsTest {
  protected:
    void SetUp() override {
        MARROWDALE_NEED_ATTRIBUTES();
        makeFolder(path(".Trash"));
        makeFolder(path("app:.Trash"));
    }
    void addTrashed(std::string_view name, const Date& date) {
        writeFile(path(name), "");
        setDate(name, date);
    }
    void setDate(std::string_view name, const Date& date) {
        setAttribute(path(name), trashDateName, archive(ArchivedObject(date))->text());
    }
    std::optional<Date> dateOf(std::string_view name) {
        const auto data = initWithValueOfXattr(platform_, trashDateAttribute, url(name));
        const auto date = data ? unarchivedObject<Date>(platform_, *data, "test")
                               : std::unexpected(UnarchiveError::invalidResultingClass);
        return date ? std::optional(*date) : std::nullopt;
    }
    void purge() {
        std::promise<void> done;
        int calls = 0;
        removeTrashedItemsOlderThan(platform_, reference_, [&] {
            ++calls;
            done.set_value();
        });
        ASSERT_EQ(done.get_future().wait_for(std::chrono::seconds(60)), std::future_status::ready);
        EXPECT_EQ(calls, 1);
    }

    const Date reference_{1'700'000'000, 500};
    const Date before_{1'700'000'000, 499};
    const Date after_{1'700'000'000, 501};
};
INSTANTIATE_TEST_SUITE_P(OnEach, TrashPurgeTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(TrashPurgeTest, onlyWhatIsStrictlyOlderGoes) {
    for (const std::string place : {".Trash/", "app:.Trash/"}) {
        addTrashed(place + "old", before_);
        addTrashed(place + "equal", reference_);
        addTrashed(place + "new", after_);
    }
    const std::string old = identifierOf(".Trash/old");
    world_.sink->clear();
    purge();
    for (const std::string place : {".Trash/", "app:.Trash/"}) {
        EXPECT_FALSE(exists(place + "old"));
        EXPECT_TRUE(exists(place + "equal"));
        EXPECT_TRUE(exists(place + "new"));
    }
    EXPECT_TRUE(logHasInOrder(
        {" remove trashed items older than 2023-11-14T22:13:20.000000500Z",
         " fetching item identifier for \"" + url("app:.Trash/old").absoluteString() + "\"",
         " was trashed before reference date, let's remove it",
         " fetching item identifier for \"" + url(".Trash/old").absoluteString() + "\"",
         "[DEBUG] item " + old + " was trashed before reference date, let's remove it",
         " delete item \"" + old + "\"", "[DEBUG] wait until all deletions are complete"}));
}

TEST_P(TrashPurgeTest, whatHasNoDateGetsThePresentOne) {
    writeFile(path(".Trash/undated"), "");
    const Date start = Date::now();
    purge();
    ASSERT_TRUE(exists(".Trash/undated"));
    const auto date = dateOf(".Trash/undated");
    ASSERT_TRUE(date);
    EXPECT_GE(*date, start);
    EXPECT_EQ(count("[DEBUG] can't find trash date for URL \"" + path(".Trash/undated") +
                    "\"; set current date"),
              1U);
}

TEST_P(TrashPurgeTest, whatHasADamagedDateGetsThePresentOne) {
    for (const std::string& bytes :
         {std::string(), std::string("bplist00"), archive(ArchivedObject(std::string("x")))->text(),
          std::string(1000, '\xff')}) {
        writeFile(path(".Trash/damaged"), "");
        setAttribute(path(".Trash/damaged"), trashDateName, bytes);
        world_.sink->clear();
        purge();
        ASSERT_TRUE(exists(".Trash/damaged"));
        EXPECT_TRUE(dateOf(".Trash/damaged"));
        EXPECT_EQ(count("[DEBUG] can't unarchive xattr data for URL \"" + path(".Trash/damaged") +
                        "\"; set current date"),
                  1U);
    }
}

TEST_P(TrashPurgeTest, aFolderIsJudgedByItsOwnDate) {
    makeFolder(path(".Trash/old/inner"));
    addTrashed(".Trash/old/inner/new", after_);
    setDate(".Trash/old", before_);
    makeFolder(path(".Trash/new"));
    addTrashed(".Trash/new/old", before_);
    setDate(".Trash/new", after_);
    purge();
    EXPECT_FALSE(exists(".Trash/old"));
    EXPECT_TRUE(exists(".Trash/new/old"));
}

TEST_P(TrashPurgeTest, hiddenEntriesStay) {
    addTrashed(".Trash/.hidden", before_);
    purge();
    EXPECT_TRUE(exists(".Trash/.hidden"));
}

TEST_P(TrashPurgeTest, withoutATrashTheHostIsToldAllTheSame) {
    purge();
    std::filesystem::remove(path(".Trash"));
    std::filesystem::remove(path("app:.Trash"));
    world_.sink->clear();
    purge();
    EXPECT_EQ(count("[ERROR] can't create file enumerator at " + path(".Trash")), 1U);
    EXPECT_EQ(count("[ERROR] can't create file enumerator at " + path("app:.Trash")), 1U);
}

TEST_P(TrashPurgeTest, aTrashThatIsALinkIsNotPurged) {
    std::filesystem::remove(path(".Trash"));
    makeFolder(directory_.path("elsewhere"));
    writeFile(directory_.path("elsewhere/old"), "");
    setAttribute(directory_.path("elsewhere/old"), trashDateName,
                 archive(ArchivedObject(before_))->text());
    std::filesystem::create_directory_symlink(directory_.path("elsewhere"), path(".Trash"));
    purge();
    EXPECT_TRUE(std::filesystem::exists(directory_.path("elsewhere/old")));
}

TEST_P(TrashPurgeTest, deletionsThatFailAreLogged) {
    addTrashed(".Trash/old", before_);
    const std::string item = identifierOf(".Trash/old");
    const Error error = errorWithPOSIXCode(EIO, "remove", "x");
    world_.fileOperations.answer = [&](Operation, const URL&) {
        return std::optional(Expected<URL>(Unexpected(error)));
    };
    purge();
    EXPECT_TRUE(exists(".Trash/old"));
    EXPECT_EQ(count("[ERROR] can't remove item " + item + "; " + error.description()), 1U);
}

TEST_P(TrashPurgeTest, whatHasNoIdentifierStays) {
    // Only an application identifies a folder of that name.
    makeFolder(path(".Trash/Documents"));
    setDate(".Trash/Documents", before_);
    purge();
    EXPECT_TRUE(exists(".Trash/Documents"));
    EXPECT_EQ(count("[ERROR] identifier lookup failed for URL \"" +
                    url(".Trash/Documents").absoluteString() + "\""),
              1U);
}

TEST_P(TrashPurgeTest, theHostIsToldAfterTheLastDeletion) {
    addTrashed(".Trash/old", before_);
    addTrashed(".Trash/older", before_);
    std::vector<FileOperations::ErrorHandler> kept;
    class Keeping final : public ForwardingFileOperations {
      public:
        Keeping(FileOperations& target, std::vector<ErrorHandler>& kept)
            : ForwardingFileOperations(target), kept_(kept) {}
        void deleteItemAtURL(const URL& /*item*/, ErrorHandler handler) override {
            kept_.push_back(std::move(handler));
        }

      private:
        std::vector<ErrorHandler>& kept_;
    } keeping(world_.fileOperations, kept);
    const Platform platform = withFileOperations(platform_, keeping);
    std::promise<void> done;
    auto told = done.get_future();
    removeTrashedItemsOlderThan(platform, reference_, [&] { done.set_value(); });
    ASSERT_EQ(kept.size(), 2U);
    // The section is closed, the host not told.
    EXPECT_TRUE(world_.sink->lines().back().starts_with("[DEBUG] ┗"));
    EXPECT_EQ(told.wait_for(std::chrono::seconds(0)), std::future_status::timeout);
    kept[0](std::nullopt);
    EXPECT_EQ(told.wait_for(std::chrono::seconds(0)), std::future_status::timeout);
    kept[1](std::nullopt);
    EXPECT_EQ(told.wait_for(std::chrono::seconds(60)), std::future_status::ready);
}

// Where nothing is deleted too.
TEST_P(TrashPurgeTest, theCallReturnsBeforeTheHostHasHeard) {
    std::promise<void> returned;
    std::promise<bool> heard;
    removeTrashedItemsOlderThan(platform_, reference_, [&] {
        heard.set_value(returned.get_future().wait_for(std::chrono::seconds(60)) ==
                        std::future_status::ready);
    });
    returned.set_value();
    EXPECT_TRUE(heard.get_future().get());
}

// Its date is read when it is judged, not when the folder was listed.
TEST_P(TrashPurgeTest, whatIsTrashedAnewMeanwhileStays) {
    addTrashed(".Trash/a", before_);
    addTrashed(".Trash/b", before_);
    world_.fileOperations.answer = [&](Operation, const URL&) -> std::optional<Expected<URL>> {
        setDate(".Trash/a", after_);  // both are still there at the first deletion
        setDate(".Trash/b", after_);
        return std::nullopt;
    };
    purge();
    EXPECT_EQ(int{exists(".Trash/a")} + int{exists(".Trash/b")}, 1);
}

TEST_P(TrashPurgeTest, whatCanNotBeDatedStays) {
    writeFile(path(".Trash/undated"), "");
    class Refusing final : public ForwardingExtendedAttributes {
      public:
        using ForwardingExtendedAttributes::ForwardingExtendedAttributes;
        Expected<void> set(const OpenFile& /*file*/, std::string_view /*name*/,
                           const Data& /*value*/) override {
            return Unexpected(errorWithPOSIXCode(ENOSPC));
        }
    } refusing(platform_.extendedAttributes);
    const Platform platform = withExtendedAttributes(platform_, refusing);
    std::promise<void> done;
    removeTrashedItemsOlderThan(platform, reference_, [&] { done.set_value(); });
    done.get_future().get();
    EXPECT_TRUE(exists(".Trash/undated"));
    EXPECT_FALSE(dateOf(".Trash/undated"));
    EXPECT_EQ(world_.sink->count("[ERROR] can't set xattr com.quillory.trash.time#PS on " +
                                 url(".Trash/undated").absoluteString() + "; " +
                                 errorWithPOSIXCode(ENOSPC).description()),
              1U);
}

TEST_P(TrashPurgeTest, anyNumberOfEntriesGoes) {
    constexpr int many = 2500;
    for (int i = 0; i < many; ++i) {
        addTrashed(".Trash/" + std::to_string(i), i % 2 == 0 ? before_ : after_);
    }
    purge();
    int left = 0;
    for (int i = 0; i < many; ++i) {
        left += exists(".Trash/" + std::to_string(i)) ? 1 : 0;
    }
    EXPECT_EQ(left, many / 2);
}

}  // namespace
}  // namespace marrowdale
