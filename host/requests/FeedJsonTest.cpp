#include <cerrno>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/requests/ErrorJson.h"
#include "host/requests/FeedJson.h"
#include "host/requests/TagNames.h"
#include "host/testing/FakeExtension.h"

namespace marrowdale::host {
namespace {

// An item with a value in every field.
std::shared_ptr<FakeItem> fullItem() {
    const std::vector<std::string> tags{"red", "blau ü"};
    auto item = std::make_shared<FakeItem>("did=7", "/root/bytes \xFF\n");
    item->parentItemIdentifier = "fid=3";
    item->typeIdentifier = "text/plain";
    item->documentSize = 18'446'744'073'709'551'615U;
    item->creationDate = Date{-1, 500'000'000};
    item->contentModificationDate = Date{1'700'000'000, 1};
    item->childItemCount = 2;
    item->capabilities = 63;
    item->versionIdentifier = Data::fromText("version");
    item->isTrashed = true;
    item->lastUsedDate = Date{0, 0};
    item->tagData = tagDataFor(tags);
    item->favoriteRank = Number(std::int64_t{-3});
    item->fileID = 12;
    item->docID = 7;
    item->hx_appContainerBundleIdentifier = "org.example.Notes";
    item->folder = true;
    item->container = true;
    return item;
}

TEST(FeedJsonTest, anItemComesBackAsItWasWritten) {
    const auto item = fullItem();
    const auto received = itemFromJson(itemJson(*item));
    ASSERT_TRUE(received.has_value());
    EXPECT_EQ(itemJson(**received), itemJson(*item));
    EXPECT_EQ((*received)->filename, "bytes \xFF\n");
    EXPECT_EQ((*received)->documentSize, item->documentSize);
    EXPECT_EQ((*received)->contentModificationDate, item->contentModificationDate);
    EXPECT_EQ((*received)->favoriteRank, item->favoriteRank);
    EXPECT_EQ(tagNames(**received), tagNames(*item));
    EXPECT_EQ((*received)->fileURL.path(), "/root/bytes \xFF\n");
    const FakeItem plain("did=1", "/root/a");
    EXPECT_EQ(itemJson(**itemFromJson(itemJson(plain))), itemJson(plain));
}

TEST(FeedJsonTest, pagesChangesAndAnchorsComeBackAsTheyWereWritten) {
    const ItemPage page{{fullItem(), fullItem()}, Data::fromText("next")};
    EXPECT_EQ(pageJson(*pageFromJson(pageJson(page))), pageJson(page));
    const ItemPage last{{}, std::nullopt};
    EXPECT_EQ(pageJson(*pageFromJson(pageJson(last))), R"({"items":[],"nextPage":null})");
    const ItemChanges changes{
        {fullItem()}, {"did=1", "\xFF"}, Data::fromText("at"), MoreComing::yes};
    EXPECT_EQ(changesJson(*changesFromJson(changesJson(changes))), changesJson(changes));
    for (const auto& anchor : {std::optional<Data>(), std::optional(Data::fromText("at"))}) {
        EXPECT_EQ(anchorFromJson(anchorJson(anchor)).value(), anchor);
    }
    const std::vector<Finding> findings{{"a", FindingStatus::note, "message", "advice"},
                                        {"b", FindingStatus::problem, "\xFF", ""}};
    EXPECT_EQ(findingsJson(*findingsFromJson(findingsJson(findings))), findingsJson(findings));
    EXPECT_EQ(processIDFromJson(serviceJson("1.0", 12)).value(), 12U);
}

TEST(FeedJsonTest, whatIsNoAnswerIsNotUnderstood) {
    for (const char* text : {"", "[]", "{}", "7", R"({"items":[{}],"nextPage":null})",
                             R"({"items":7})", R"({"updated":[],"deleted":[1],"moreComing":false})",
                             R"({"findings":[{"finding":"a","status":"odd","message":""}]})"}) {
        EXPECT_EQ(itemFromJson(text).error().code, EPROTO) << text;
        EXPECT_EQ(pageFromJson(text).error().code, EPROTO) << text;
        EXPECT_EQ(changesFromJson(text).error().code, EPROTO) << text;
        EXPECT_EQ(anchorFromJson(text).error().code, EPROTO) << text;
        EXPECT_EQ(findingsFromJson(text).error().code, EPROTO) << text;
        EXPECT_EQ(textFromJson("path", text).error().code, EPROTO) << text;
        EXPECT_EQ(processIDFromJson(text).error().code, EPROTO) << text;
        EXPECT_EQ(errorFromJson(text).code, EPROTO) << text;
    }
}

TEST(FeedJsonTest, anErrorComesBackAsItWasTold) {
    for (const Error& error :
         {errorForNonExistentItem("did=9"), errorSyncAnchorExpired(),
          errorInvalidParameter("ITEM", "did=\xFF"), errorFileWriteNoPermission(),
          errorWithPOSIXCode(ENOSPC, "write", "/root/a"), Error{ErrorDomain::provider, 3, {}, "x"},
          collisionErrorForItem(fullItem())}) {
        const Error back = errorFromJson(errorJson(error));
        EXPECT_EQ(back, error);
        EXPECT_EQ(errorJson(back), errorJson(error));
    }
}

}  // namespace
}  // namespace marrowdale::host
