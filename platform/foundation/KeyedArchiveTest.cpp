#include <cerrno>
#include <limits>

#include <gtest/gtest.h>

#include "platform/foundation/KeyedArchive.h"
#include "platform/foundation/PropertyList.h"

namespace marrowdale {
namespace {

ArchivedObject nontrivialObject() {
    ArchivedDictionary inner;
    inner.emplace("date", ArchivedObject(Date{1'769'903'999, 1}));
    inner.emplace("record", ArchivedObject(ArchivedBundleRecord{"org.example.Notes"}));
    inner.emplace("data", ArchivedObject(Data::fromText("bytes")));
    ArchivedArray array;
    array.emplace_back(std::move(inner));
    array.emplace_back(std::string("\xC3\xA4"));
    array.emplace_back(Number(std::uint64_t{5}));
    array.emplace_back(ArchivedArray());
    return ArchivedObject(std::move(array));
}

class KeyedArchiveTest : public testing::TestWithParam<ArchivedObject> {};

TEST_P(KeyedArchiveTest, objectsComeBack) {
    const auto data = archive(GetParam());
    ASSERT_TRUE(data) << data.error().description();
    const auto object = unarchive(data->bytes());
    ASSERT_TRUE(object) << object.error().description();
    EXPECT_EQ(*object, GetParam());
    EXPECT_EQ(object->className(), GetParam().className());
}

INSTANTIATE_TEST_SUITE_P(
    Objects, KeyedArchiveTest,
    testing::Values(ArchivedObject(Date{0, 0}), ArchivedObject(Date{-1, 999'999'999}),
                    ArchivedObject(Date{std::numeric_limits<std::int64_t>::min(), 1}),
                    ArchivedObject(Date{std::numeric_limits<std::int64_t>::max(), 999'999'999}),
                    ArchivedObject(Number(std::int64_t{5})),
                    ArchivedObject(Number(std::uint64_t{5})),
                    ArchivedObject(Number(std::int64_t{-5})),
                    ArchivedObject(Number(std::numeric_limits<std::int64_t>::min())),
                    ArchivedObject(Number(std::numeric_limits<std::uint64_t>::max())),
                    ArchivedObject(Number(5.0)), ArchivedObject(Number(1e300)),
                    ArchivedObject(std::string()), ArchivedObject(std::string("/a/b")),
                    ArchivedObject(std::string("\xFF is no UTF-8")), ArchivedObject(Data()),
                    ArchivedObject(Data::fromText("text")), ArchivedObject(ArchivedArray()),
                    ArchivedObject(ArchivedDictionary()),
                    ArchivedObject(ArchivedBundleRecord{"org.example.Notes"}), nontrivialObject()));

TEST(KeyedArchiveTest, everyClassHasItsName) {
    EXPECT_EQ(ArchivedObject(Date{}).className(), "OrbDate");
    EXPECT_EQ(ArchivedObject(Number(1.0)).className(), "OrbNumber");
    EXPECT_EQ(ArchivedObject(std::string()).className(), "OrbString");
    EXPECT_EQ(ArchivedObject(Data()).className(), "OrbData");
    EXPECT_EQ(ArchivedObject(ArchivedArray()).className(), "OrbArray");
    EXPECT_EQ(ArchivedObject(ArchivedDictionary()).className(), "OrbDictionary");
    EXPECT_EQ(ArchivedObject(ArchivedBundleRecord()).className(), "OrbBundleRecord");
}

// Attributes share as little as 4 KB of an inode; the archives in them have to be small.
TEST(KeyedArchiveTest, smallValuesAreSmallArchives) {
    EXPECT_LE(archive(ArchivedObject(Date{1'769'903'999, 123'456'789}))->size(), 128U);
    EXPECT_LE(archive(ArchivedObject(Number(std::int64_t{5})))->size(), 128U);
}

PropertyList rootList(PropertyList version, const char* className, PropertyList value) {
    PropertyListDictionary root;
    root.emplace("version", std::move(version));
    root.emplace("class", PropertyList(std::string(className)));
    root.emplace("value", std::move(value));
    return PropertyList(std::move(root));
}

bool isRefused(const PropertyList& list) {
    const auto object = unarchive(encodePropertyList(list)->bytes());
    return !object && object.error() == errorWithPOSIXCode(EBADMSG);
}

PropertyList pair(PropertyList first, PropertyList second) {
    return PropertyList(PropertyListArray{std::move(first), std::move(second)});
}

TEST(KeyedArchiveTest, whatIsNoArchiveIsRefused) {
    const PropertyList one(std::int64_t{1});
    const PropertyList text(std::string("text"));
    ASSERT_FALSE(isRefused(rootList(one, "OrbString", text)));
    EXPECT_TRUE(isRefused(text));
    EXPECT_TRUE(isRefused(PropertyList(PropertyListDictionary())));
    EXPECT_TRUE(isRefused(rootList(PropertyList(std::int64_t{2}), "OrbString", text)));
    EXPECT_TRUE(isRefused(rootList(text, "OrbString", text)));
    EXPECT_TRUE(isRefused(rootList(one, "OrbSomething", text)));
    EXPECT_TRUE(isRefused(rootList(one, "", text)));
    PropertyListDictionary extra = *rootList(one, "OrbString", text).as<PropertyListDictionary>();
    extra.emplace("more", text);
    EXPECT_TRUE(isRefused(PropertyList(extra)));
    extra.erase("more");
    extra.erase("version");
    EXPECT_TRUE(isRefused(PropertyList(extra)));
    EXPECT_FALSE(unarchive({}));
}

TEST(KeyedArchiveTest, valuesOfAnotherShapeThanTheirClassAreRefused) {
    const PropertyList one(std::int64_t{1});
    const PropertyList text(std::string("text"));
    const PropertyList list(PropertyListArray{one});
    for (const char* name : {"OrbDate", "OrbNumber", "OrbString", "OrbData", "OrbArray",
                             "OrbDictionary", "OrbBundleRecord"}) {
        EXPECT_TRUE(isRefused(rootList(one, name, one))) << name;
        EXPECT_TRUE(isRefused(rootList(one, name, list))) << name;
        EXPECT_TRUE(isRefused(rootList(one, name, PropertyList(Date{})))) << name;
    }
    const auto refusedDate = [&](PropertyList seconds, PropertyList nanoseconds) {
        return isRefused(
            rootList(one, "OrbDate", pair(std::move(seconds), std::move(nanoseconds))));
    };
    EXPECT_TRUE(refusedDate(one, PropertyList(std::int64_t{1'000'000'000})));
    EXPECT_TRUE(refusedDate(one, PropertyList(std::int64_t{-1})));
    EXPECT_TRUE(refusedDate(PropertyList(std::uint64_t{1} << 63), one));
    const auto refusedNumber = [&](const char* kind, PropertyList number) {
        return isRefused(
            rootList(one, "OrbNumber", pair(PropertyList(std::string(kind)), std::move(number))));
    };
    EXPECT_FALSE(refusedNumber("int64", one));
    EXPECT_TRUE(refusedNumber("int32", one));
    EXPECT_TRUE(refusedNumber("double", one));
    EXPECT_TRUE(refusedNumber("uint64", PropertyList(std::int64_t{-1})));
    EXPECT_TRUE(refusedNumber("int64", PropertyList(std::uint64_t{1} << 63)));
    EXPECT_TRUE(refusedNumber("int64", PropertyList(1.0)));
    EXPECT_TRUE(isRefused(rootList(one, "OrbString", PropertyList(Data::fromText("text")))));
}

TEST(KeyedArchiveTest, whatCannotBeArchivedIsRefused) {
    EXPECT_EQ(archive(ArchivedObject(Date{0, 1'000'000'000})).error(), errorWithPOSIXCode(EINVAL));
    ArchivedDictionary dictionary;
    dictionary.emplace("\xFF", ArchivedObject(std::string("value")));
    EXPECT_EQ(archive(ArchivedObject(dictionary)).error(), errorWithPOSIXCode(EINVAL));
    ArchivedObject deep{ArchivedArray()};
    for (int i = 0; i < 1000; ++i) {
        deep = ArchivedObject(ArchivedArray{deep});
        const auto data = archive(deep);
        if (data) {
            ASSERT_EQ(*unarchive(data->bytes()), deep);
        } else {
            ASSERT_EQ(data.error(), errorWithPOSIXCode(EINVAL));
        }
    }
    EXPECT_FALSE(archive(deep));
}

TEST(KeyedArchiveTest, everyTruncationIsRefused) {
    const Data data = *archive(nontrivialObject());
    for (std::size_t length = 0; length < data.size(); ++length) {
        EXPECT_FALSE(unarchive(data.bytes().first(length))) << length;
    }
}

TEST(KeyedArchiveTest, everyChangedByteIsReadWholeOrRefused) {
    const Data data = *archive(nontrivialObject());
    for (std::size_t i = 0; i < data.size(); ++i) {
        for (int value = 0; value < 256; ++value) {
            Bytes damaged(data.bytes().begin(), data.bytes().end());
            damaged[i] = static_cast<std::uint8_t>(value);
            if (const auto object = unarchive(damaged)) {
                EXPECT_TRUE(archive(*object)) << i << " " << value;
            }
        }
    }
}

}  // namespace
}  // namespace marrowdale
