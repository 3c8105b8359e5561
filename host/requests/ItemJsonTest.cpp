#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "host/requests/ItemJson.h"
#include "host/requests/TagNames.h"
#include "host/testing/FakeExtension.h"
#include "platform/foundation/PropertyList.h"

namespace marrowdale::host {
namespace {

std::string jsonText(const FileProviderItem& item) {
    JsonWriter writer;
    appendItem(writer, item);
    return writer.take();
}

Data tagData(const std::vector<std::string>& labels) {
    PropertyListArray tags;
    for (const std::string& label : labels) {
        tags.emplace_back(PropertyListDictionary{{"label", PropertyList(label)},
                                                 {"color", PropertyList(std::int64_t{0})}});
    }
    return encodePropertyList(PropertyList(tags)).value();
}

TEST(ItemJsonTest, aFieldWithoutAValueIsAbsent) {
    FakeItem item("did=1", "/root/a");
    item.parentItemIdentifier = "root";
    item.typeIdentifier = "text/plain";
    EXPECT_EQ(jsonText(item),
              R"({"itemIdentifier":"did=1","parentItemIdentifier":"root","filename":"a",)"
              R"("typeIdentifier":"text/plain","capabilities":0,"isTrashed":false,)"
              R"("path":"/root/a","isFolder":false,"isContainer":false})");
}

TEST(ItemJsonTest, everyFieldThatHasAValueIsThere) {
    FakeItem item("did=7", "/root/a");
    item.documentSize = std::numeric_limits<std::uint64_t>::max();
    item.creationDate = Date{-1, 500'000'000};
    item.contentModificationDate = Date{1, 1};
    item.childItemCount = 3;
    item.capabilities = 63;
    item.versionIdentifier = Data(Bytes{0xFF, 0xFE, 0xFD});
    item.isTrashed = true;
    item.lastUsedDate = Date{0, 0};
    item.tagData = tagData({"red", "ä\"b"});
    item.favoriteRank = Number(std::uint64_t{1} << 60U);
    item.fileID = (std::uint64_t{1} << 53U) + 1;
    item.docID = 7;
    item.hx_appContainerBundleIdentifier = "org.example.Notes";
    item.folder = true;
    item.container = true;
    const std::string text = jsonText(item);
    EXPECT_TRUE(text.contains(R"("documentSize":18446744073709551615)")) << text;
    EXPECT_TRUE(text.contains(R"("fileID":9007199254740993)")) << text;
    const auto json = nlohmann::json::parse(text);
    EXPECT_EQ(json["creationDate"], "1969-12-31T23:59:59.500000000Z");
    EXPECT_EQ(json["contentModificationDate"], "1970-01-01T00:00:01.000000001Z");
    EXPECT_EQ(json["childItemCount"], 3);
    EXPECT_EQ(json["capabilities"], 63);
    EXPECT_EQ(json["versionIdentifier"], "//79");
    EXPECT_EQ(json["isTrashed"], true);
    EXPECT_EQ(json["lastUsedDate"], "1970-01-01T00:00:00.000000000Z");
    EXPECT_EQ(json["tags"], nlohmann::json::array({"red", "ä\"b"}));
    EXPECT_EQ(json["favoriteRank"], std::uint64_t{1} << 60U);
    EXPECT_EQ(json["docID"], 7);
    EXPECT_EQ(json["isFolder"], true);
    EXPECT_EQ(json["isContainer"], true);
    EXPECT_EQ(json["appContainerBundleIdentifier"], "org.example.Notes");
}

TEST(ItemJsonTest, aRankKeepsItsSignAndFractionAndOneThatJSONCanNotTellIsAbsent) {
    FakeItem item("did=1");
    item.favoriteRank = Number(std::int64_t{-5});
    EXPECT_TRUE(jsonText(item).contains(R"("favoriteRank":-5)"));
    item.favoriteRank = Number(0.5);
    EXPECT_TRUE(jsonText(item).contains(R"("favoriteRank":0.5)"));
    item.favoriteRank = Number(std::numeric_limits<double>::infinity());
    EXPECT_FALSE(jsonText(item).contains("favoriteRank"));
}

TEST(ItemJsonTest, aDateThatRFC3339HasNoTextForIsAbsent) {
    FakeItem item("did=1");
    item.contentModificationDate = Date{253'402'300'799, 999'999'999};
    item.creationDate = Date{-62'167'219'200, 0};
    const std::string within = jsonText(item);
    EXPECT_TRUE(within.contains(R"("contentModificationDate":"9999-12-31T23:59:59.999999999Z")"));
    EXPECT_TRUE(within.contains(R"("creationDate":"0000-01-01T00:00:00.000000000Z")"));
    item.contentModificationDate = Date{253'402'300'800, 0};
    item.creationDate = Date{-62'167'219'201, 999'999'999};
    item.lastUsedDate = Date{std::numeric_limits<std::int64_t>::max(), 0};
    EXPECT_FALSE(jsonText(item).contains("Date"));
    item.lastUsedDate = Date{std::numeric_limits<std::int64_t>::min(), 0};
    EXPECT_FALSE(jsonText(item).contains("Date"));
}

TEST(ItemJsonTest, tagDataThatCanNotBeReadHasNoTags) {
    FakeItem item("did=1");
    item.tagData = Data::fromText("not a property list");
    EXPECT_THAT(tagNames(item), ::testing::IsEmpty());
    item.tagData =
        encodePropertyList(PropertyList(PropertyListArray{PropertyList(true),
                                                          PropertyList(PropertyListDictionary{})}))
            .value();
    EXPECT_THAT(tagNames(item), ::testing::IsEmpty());
    item.tagData = tagData({});
    EXPECT_EQ(nlohmann::json::parse(jsonText(item))["tags"], nlohmann::json::array());
}

}  // namespace
}  // namespace marrowdale::host
