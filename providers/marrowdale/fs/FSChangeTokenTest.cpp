#include <cerrno>

#include <gtest/gtest.h>

#include "platform/foundation/PropertyList.h"
#include "providers/marrowdale/fs/FSChangeToken.h"

namespace marrowdale {
namespace {

const UUID deviceUUID = *UUID::fromText("C0FFEE00-0000-4000-8000-000000000001");

PropertyListDictionary wellFormed() {
    return {{"version", PropertyList(std::uint64_t{1})},
            {"deviceUUID", PropertyList(deviceUUID.text())},
            {"streamEventID", PropertyList(std::uint64_t{2})},
            {"offset", PropertyList(std::uint64_t{3})},
            {"appLibraryVersionToken", PropertyList(std::uint64_t{4})}};
}

Data encoded(PropertyListDictionary dictionary) {
    return *encodePropertyList(PropertyList(std::move(dictionary)));
}

// The well-formed token grown by a key until its encoding is of that length.
Data wholeTokenOfLength(std::size_t length) {
    for (std::size_t padding = 0; padding <= length; ++padding) {
        auto dictionary = wellFormed();
        dictionary.emplace("x", PropertyList(std::string(padding, 'x')));
        if (Data data = encoded(std::move(dictionary)); data.size() == length) {
            return data;
        }
    }
    return {};
}

TEST(FSChangeTokenTest, encodingThenDecodingAnyTokenGivesBackEqualFields) {
    constexpr std::uint64_t numbers[] = {
        0, 1, 255, 256, 1ULL << 31U, 1ULL << 32U, (1ULL << 63U) - 1, 1ULL << 63U, ~0ULL};
    for (const std::uint64_t number : numbers) {
        const FSChangeToken token{.version = number,
                                  .deviceUUID = UUID::random(),
                                  .streamEventID = ~number,
                                  .offset = number / 3,
                                  .appLibraryVersionToken = number ^ 5U};
        const auto decoded = FSChangeToken::decode(token.encode());
        ASSERT_TRUE(decoded) << number;
        EXPECT_EQ(*decoded, token);
    }
}

TEST(FSChangeTokenTest, keepsStreamEventIDsAbove2To63) {
    const FSChangeToken token{.deviceUUID = deviceUUID, .streamEventID = (1ULL << 63U) + 17};
    EXPECT_EQ(FSChangeToken::decode(token.encode())->streamEventID, (1ULL << 63U) + 17);
}

TEST(FSChangeTokenTest, isADictionaryOfExactlyTheFieldNames) {
    const FSChangeToken token{.version = 1,
                              .deviceUUID = deviceUUID,
                              .streamEventID = 2,
                              .offset = 3,
                              .appLibraryVersionToken = 4};
    const auto list = decodePropertyList(token.encode().bytes());
    ASSERT_TRUE(list);
    const auto* dictionary = list->as<PropertyListDictionary>();
    ASSERT_NE(dictionary, nullptr);
    EXPECT_EQ(dictionary->size(), 5U);
    EXPECT_EQ(dictionary->at("version").asUnsigned(), 1U);
    EXPECT_EQ(*dictionary->at("deviceUUID").as<std::string>(),
              "C0FFEE00-0000-4000-8000-000000000001");
    EXPECT_EQ(dictionary->at("streamEventID").asUnsigned(), 2U);
    EXPECT_EQ(dictionary->at("offset").asUnsigned(), 3U);
    EXPECT_EQ(dictionary->at("appLibraryVersionToken").asUnsigned(), 4U);
}

TEST(FSChangeTokenTest, a48ByteDatumIsRefusedEvenIfItWouldDecode) {
    // No token of five keys is so short, so only what surrounds the rule can be shown with one: the
    // same bytes are refused at that length and taken at every other.
    EXPECT_FALSE(FSChangeToken::decode(Data(Bytes(48, 0))));
    const Data whole = encoded(wellFormed());
    ASSERT_GT(whole.size(), 48U);
    EXPECT_TRUE(FSChangeToken::decode(whole));
    for (std::size_t length = whole.size() + 8; length < whole.size() + 40; ++length) {
        if (const Data padded = wholeTokenOfLength(length); !padded.empty()) {
            EXPECT_TRUE(FSChangeToken::decode(padded)) << length;
        }
    }
}

TEST(FSChangeTokenTest, anEmptyDatumIsRefused) {
    const auto decoded = FSChangeToken::decode(Data());
    ASSERT_FALSE(decoded);
    EXPECT_EQ(decoded.error(), errorWithPOSIXCode(EBADMSG));
}

TEST(FSChangeTokenTest, aPropertyListLackingAnyOneOfTheFiveKeysIsRefused) {
    for (const auto& [key, value] : wellFormed()) {
        auto dictionary = wellFormed();
        dictionary.erase(key);
        EXPECT_FALSE(FSChangeToken::decode(encoded(std::move(dictionary)))) << key;
    }
}

TEST(FSChangeTokenTest, aKeyOfAnotherTypeIsRefused) {
    for (const auto& [key, value] : wellFormed()) {
        for (const PropertyList& other :
             {PropertyList(true), PropertyList(1.0), PropertyList(std::string("1")),
              PropertyList(std::int64_t{-1}), PropertyList(PropertyListArray{})}) {
            auto dictionary = wellFormed();
            dictionary[key] = other;
            EXPECT_FALSE(FSChangeToken::decode(encoded(std::move(dictionary)))) << key;
        }
    }
}

TEST(FSChangeTokenTest, aKeyOfAnotherNameIsPassedOver) {
    auto dictionary = wellFormed();
    dictionary.emplace("later", PropertyList(std::string("addition")));
    EXPECT_TRUE(FSChangeToken::decode(encoded(std::move(dictionary))));
}

TEST(FSChangeTokenTest, aTokenCutAtAnyLengthIsRefused) {
    const Bytes bytes = [] {
        const Data data = encoded(wellFormed());
        return Bytes(data.bytes().begin(), data.bytes().end());
    }();
    for (std::size_t length = 0; length < bytes.size(); ++length) {
        EXPECT_FALSE(FSChangeToken::decode(
            Data(Bytes(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(length)))))
            << length;
    }
}

TEST(FSChangeTokenTest, otherPropertyListsAreRefused) {
    for (const PropertyList& list :
         {PropertyList(true), PropertyList(std::uint64_t{7}), PropertyList(PropertyListArray{})}) {
        EXPECT_FALSE(FSChangeToken::decode(*encodePropertyList(list)));
    }
}

TEST(FSChangeTokenTest, descriptionShowsAllFiveFields) {
    const FSChangeToken token{.version = 1,
                              .deviceUUID = deviceUUID,
                              .streamEventID = 2,
                              .offset = 3,
                              .appLibraryVersionToken = 4};
    EXPECT_EQ(token.description(),
              "<FSChangeToken version:1 deviceUUID:C0FFEE00-0000-4000-8000-000000000001 "
              "streamEventID:2 offset:3 appLibraryVersionToken:4>");
}

}  // namespace
}  // namespace marrowdale
