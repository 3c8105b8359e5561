#include <cerrno>
#include <limits>
#include <sys/stat.h>

#include "platform/testing/ForwardingExtendedAttributes.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/actions/ActionsTestWorld.h"
#include "providers/marrowdale/actions/MetadataActions.h"
#include "providers/marrowdale/items/ItemMetadata.h"
#include "providers/marrowdale/items/TagData.h"

namespace marrowdale {
namespace {

constexpr const char* usedName = "user.com.quillory.lastuseddate#PS";
constexpr const char* tagsName = "user.com.quillory.metadata:_kMDItemUserTags";
constexpr const char* rankName = "user.com.quillory.favorite-rank.number#PS";

// Refuses to change attributes.
class RefusingAttributes final : public ForwardingExtendedAttributes {
  public:
    using ForwardingExtendedAttributes::ForwardingExtendedAttributes;
    Expected<void> set(const OpenFile& /*file*/, std::string_view /*name*/,
                       const Data& /*value*/) override {
        return Unexpected(errorWithPOSIXCode(ENOSPC));
    }
    Expected<void> remove(const OpenFile& /*file*/, std::string_view /*name*/) override {
        return Unexpected(errorWithPOSIXCode(EIO));
    }
};

class MetadataActionsTest : public ActionsTest {
  protected:
    Item used(std::string_view item, std::optional<Date> date) {
        return answerTo(
            [&](const auto& handler) { setLastUsedDate(platform(), date, item, handler); });
    }
    Item tag(std::string_view item, std::optional<Data> tags) {
        return answerTo([&](const auto& handler) { setTagData(platform(), tags, item, handler); });
    }
    Item rank(std::string_view item, std::optional<Number> number) {
        return answerTo(
            [&](const auto& handler) { setFavoriteRank(platform(), number, item, handler); });
    }
    const Platform& platform() const { return refuses_ ? refusing_ : platform_; }

    RefusingAttributes refusingAttributes_{world_.attributes};
    const Platform refusing_ = withExtendedAttributes(platform_, refusingAttributes_);
    bool refuses_ = false;
    const std::string library_ = "#org.example.Notes";
    const std::string nothing_ = "did=4294967295";
};
INSTANTIATE_TEST_SUITE_P(OnEach, MetadataActionsTest, ::testing::ValuesIn(testFileSystems()),
                         testFileSystemName);

TEST_P(MetadataActionsTest, aLastUsedDateIsSetAndCleared) {
    MARROWDALE_NEED_ATTRIBUTES();
    const std::string item = made("a");
    const Date date{1'700'000'000, 5};
    EXPECT_EQ((*used(item, date))->lastUsedDate, date);
    EXPECT_EQ(countContaining(" set last used date \"2023-11-14T22:13:20.000000005Z\" to item \"" +
                              item + "\""),
              1U);
    EXPECT_EQ((*used(item, std::nullopt))->lastUsedDate, std::nullopt);
    EXPECT_FALSE(attribute(path("a"), usedName));
    EXPECT_EQ(countContaining(" clearing last used date for item \"" + item + "\""), 1U);
    // Clearing what is not there is success.
    world_.sink->clear();
    EXPECT_TRUE(used(item, std::nullopt));
    EXPECT_EQ(world_.sink->countOfLevel(LogLevel::error), 0U);
    EXPECT_TRUE(logHasInOrder({" clearing last used date", " fetching URL for \"" + item,
                               " fetching item's properties for \"" + item}));
}

TEST_P(MetadataActionsTest, onlyTheLastUsedDateRefusesAppLibraries) {
    MARROWDALE_NEED_ATTRIBUTES();
    world_.sink->clear();
    const auto answer = used(library_, Date{1, 0});
    ASSERT_FALSE(answer);
    EXPECT_EQ(answer.error(), errorInvalidParameter("itemIdentifier", library_));
    EXPECT_EQ(answer.error().subject, library_);
    EXPECT_TRUE(world_.sink->lines().empty());
    EXPECT_FALSE(attribute(directory_.path("app/Documents"), usedName));
    EXPECT_TRUE(rank(library_, Number(std::uint64_t{7})));
    EXPECT_TRUE(tag(library_, std::nullopt));
}

TEST_P(MetadataActionsTest, aDateThatCanNotBeWrittenIsAnsweredAllTheSame) {
    const std::string item = made("a");
    refuses_ = true;
    EXPECT_TRUE(used(item, Date{1, 0}));
    EXPECT_TRUE(used(item, std::nullopt));
    const std::string line = "[ERROR] can't set xattr com.quillory.lastuseddate#PS on " +
                             url("a").absoluteString() + "; ";
    EXPECT_EQ(count(line + errorWithPOSIXCode(ENOSPC).description()), 1U);
    EXPECT_EQ(count(line + errorWithPOSIXCode(EIO).description()), 1U);
}

TEST_P(MetadataActionsTest, tagsKeepTheirLabelsInOrder) {
    MARROWDALE_NEED_ATTRIBUTES();
    const std::string item = made("a");
    const auto tags =
        encodeTagData({{.label = "red", .color = 6}, {.label = "", .color = 1}, {.label = "ä"}});
    const auto answer = tag(item, *tags);
    ASSERT_TRUE(answer);
    EXPECT_EQ(*decodeTagData(*(*answer)->tagData),
              (std::vector<Tag>{{.label = "red"}, {.label = ""}, {.label = "ä"}}));
    EXPECT_EQ(countContaining(" set tag data to item \"" + item + "\""), 1U);
    EXPECT_EQ(countContaining(" fetching URL for "), 0U);
}

TEST_P(MetadataActionsTest, noTagsAreAnEmptyListThatStays) {
    MARROWDALE_NEED_ATTRIBUTES();
    const std::string item = made("a");
    const std::string empty = archive(ArchivedObject(ArchivedArray{}))->text();
    const auto colored = encodeTagData({{.label = "red"}});
    for (const auto& none :
         {std::optional<Data>(), std::optional(Data::fromText("no list")), std::optional(Data())}) {
        ASSERT_TRUE(tag(item, *colored));
        const auto answer = tag(item, none);
        ASSERT_TRUE(answer);
        EXPECT_EQ(attribute(path("a"), tagsName), empty);
        EXPECT_TRUE(decodeTagData(*(*answer)->tagData)->empty());
    }
}

TEST_P(MetadataActionsTest, ranksKeepTheirWidthAndSign) {
    MARROWDALE_NEED_ATTRIBUTES();
    const std::string item = made("a");
    for (const Number& number :
         {Number(std::numeric_limits<std::uint64_t>::max()), Number(std::int64_t{-5}),
          Number(std::uint64_t{0}), Number(1.5), Number((std::uint64_t{1} << 53U) + 1)}) {
        EXPECT_EQ((*rank(item, number))->favoriteRank, number);
    }
    EXPECT_EQ(countContaining(" set favorite rank \"18446744073709551615\" to item \"" + item), 1U);
    EXPECT_EQ(countContaining(" set favorite rank \"-5\" to item \"" + item), 1U);
    EXPECT_EQ(countContaining(" set favorite rank \"1.5\" to item \"" + item), 1U);
    EXPECT_EQ((*rank(item, std::nullopt))->favoriteRank, std::nullopt);
    EXPECT_EQ(countContaining(" set favorite rank \"nil\" to item \"" + item + "\""), 1U);
    EXPECT_FALSE(attribute(path("a"), rankName));
}

TEST_P(MetadataActionsTest, tagsAndRanksThatCanNotBeWrittenAreAnswered) {
    const std::string item = made("a");
    refuses_ = true;
    const auto tagged = tag(item, std::nullopt);
    ASSERT_FALSE(tagged);
    EXPECT_EQ(tagged.error(), errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(count("[ERROR] can't set xattr com.quillory.metadata:_kMDItemUserTags on " +
                    url("a").absoluteString() + "; " + errorWithPOSIXCode(ENOSPC).description()),
              1U);
    EXPECT_EQ(rank(item, Number(std::uint64_t{1})).error(), errorWithPOSIXCode(ENOSPC));
    EXPECT_EQ(rank(item, std::nullopt).error(), errorWithPOSIXCode(EIO));
    EXPECT_EQ(countContaining("[ERROR] can't set xattr com.quillory.favorite-rank.number#PS on " +
                              url("a").absoluteString() + "; "),
              2U);
}

TEST_P(MetadataActionsTest, aReadOnlyFileIsSaid) {
    if (runsAsRoot()) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    const std::string item = made("a");
    ASSERT_EQ(::chmod(path("a").c_str(), 0444), 0);
    EXPECT_TRUE(used(item, Date{1, 0}));
    EXPECT_EQ(tag(item, std::nullopt).error(), errorWithPOSIXCode(EACCES));
    EXPECT_EQ(rank(item, Number(std::uint64_t{1})).error(), errorWithPOSIXCode(EACCES));
    EXPECT_EQ(countContaining("[ERROR] can't set xattr "), 3U);
}

TEST_P(MetadataActionsTest, aMissingItemIsEachSettersOwnError) {
    const Error error = errorForNonExistentItem(nothing_);
    EXPECT_EQ(used(nothing_, Date{1, 0}).error(), error);
    EXPECT_EQ(rank(nothing_, std::nullopt).error(), error);
    EXPECT_EQ(countContaining(" fetching URL for \"" + nothing_ + "\""), 2U);
    EXPECT_EQ(count("[ERROR] can't find URL for item; " + error.description()), 0U);
    EXPECT_EQ(tag(nothing_, std::nullopt).error(), error);
    EXPECT_EQ(count("[ERROR] can't find URL for item; " + error.description()), 1U);
    EXPECT_EQ(countContaining(" fetching URL for \"" + nothing_ + "\""), 2U);
}

TEST_P(MetadataActionsTest, settersAnswerBeforeTheyReturn) {
    const std::string item = made("a");
    int answers = 0;
    const auto counting = [&](const Item&) { ++answers; };
    setLastUsedDate(platform_, std::nullopt, item, counting);
    setTagData(platform_, std::nullopt, item, counting);
    setFavoriteRank(platform_, std::nullopt, item, counting);
    EXPECT_EQ(answers, 3);
}

TEST_P(MetadataActionsTest, linksTakeNoAttributes) {
    writeFile(directory_.path("outside"), "");
    std::filesystem::create_symlink(directory_.path("outside"), path("link"));
    const std::string item = identifierOf("link");
    EXPECT_EQ(tag(item, std::nullopt).error(), errorWithPOSIXCode(ENOTSUP));
    EXPECT_TRUE(used(item, Date{1, 0}));
    EXPECT_FALSE(hasAttributes() && attribute(directory_.path("outside"), tagsName));
}

TEST_P(MetadataActionsTest, metadataGoesWithTheFile) {
    MARROWDALE_NEED_ATTRIBUTES();
    const std::string item = made("a");
    ASSERT_TRUE(rank(item, Number(std::uint64_t{9})));
    std::filesystem::rename(path("a"), path("b"));
    EXPECT_EQ((*fetchItem(platform_, item))->favoriteRank, Number(std::uint64_t{9}));
}

}  // namespace
}  // namespace marrowdale
