#include <cerrno>

#include <gtest/gtest.h>

#include "platform/foundation/PropertyList.h"
#include "providers/marrowdale/items/TagData.h"

namespace marrowdale {
namespace {

TEST(TagDataTest, tagsComeBackAsTheyWere) {
    const std::vector<Tag> tags{{.label = "red", .color = 0},
                                {.label = "", .color = 7},
                                {.label = "gr\xc3\xbcn\n", .color = ~std::uint64_t{0}}};
    EXPECT_EQ(*decodeTagData(*encodeTagData(tags)), tags);
    EXPECT_EQ(*decodeTagData(*encodeTagData({})), std::vector<Tag>{});
}

TEST(TagDataTest, isAnArrayOfDictionariesWithLabelAndColor) {
    const auto list = decodePropertyList(encodeTagData({{.label = "red", .color = 3}})->bytes());
    ASSERT_TRUE(list);
    EXPECT_EQ(*list, PropertyList(PropertyListArray{PropertyList(
                         PropertyListDictionary{{"label", PropertyList(std::string("red"))},
                                                {"color", PropertyList(std::int64_t{3})}})}));
}

TEST(TagDataTest, aLabelThatIsNotUTF8CantBeEncoded) {
    const auto encoded = encodeTagData({{.label = "\xff", .color = 0}});
    ASSERT_FALSE(encoded);
    EXPECT_EQ(encoded.error(), errorWithPOSIXCode(EINVAL));
}

TEST(TagDataTest, everythingElseIsRefused) {
    const PropertyList text(std::string("red"));
    const PropertyList wrong[] = {
        text,
        PropertyList(PropertyListArray{text}),
        PropertyList(PropertyListArray{PropertyList(PropertyListDictionary{{"label", text}})}),
        PropertyList(PropertyListArray{
            PropertyList(PropertyListDictionary{{"label", text}, {"color", text}})}),
        PropertyList(PropertyListArray{PropertyList(PropertyListDictionary{
            {"label", PropertyList(std::int64_t{0})}, {"color", PropertyList(std::int64_t{0})}})}),
    };
    for (const PropertyList& list : wrong) {
        const auto decoded = decodeTagData(*encodePropertyList(list));
        ASSERT_FALSE(decoded);
        EXPECT_EQ(decoded.error(), errorWithPOSIXCode(EBADMSG));
    }
    EXPECT_FALSE(decodeTagData(Data()));
}

}  // namespace
}  // namespace marrowdale
