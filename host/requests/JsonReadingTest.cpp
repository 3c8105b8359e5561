#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "host/requests/JsonReading.h"
#include "host/requests/JsonWriter.h"

namespace marrowdale::host {
namespace {

std::string written(std::string_view text) {
    JsonWriter writer;
    writer.beginObject().key("text").string(text).endObject();
    return writer.take();
}

TEST(JsonReadingTest, everyTextComesBackByteForByte) {
    using namespace std::string_literals;
    for (const std::string& text :
         {""s, "plain"s, "\xFF"s, "a\x80z"s, "\0"s, "\0\0ff"s, "\xED\xB2\x80"s, "\xF4\x8F\xBF\xBF"s,
          "\\udcff"s, "\\u0000"s, "\"\\/\b\f\n\r\t\x7F"s, "ü€𝄞"s, "\xC3"s, "\0"s + "\xFF"s}) {
        const auto object = parsedJson(written(text));
        ASSERT_TRUE(object.has_value()) << written(text);
        EXPECT_EQ(textMember(*object, "text"), text) << written(text);
    }
}

TEST(JsonReadingTest, whatIsNoJsonHasNoValue) {
    for (const char* text : {"", "{", "nonsense", "{\"a\":}", "\"\\ud800\"", "\"\\udc00\"",
                             "\"\\ud8", "\"\xFF\"", "1 2", "\"\\", "[1,]"}) {
        EXPECT_FALSE(parsedJson(text).has_value()) << text;
    }
}

TEST(JsonReadingTest, nestingHasAnEnd) {
    const auto nested = [](std::size_t depth) {
        return std::string(depth, '[') + std::string(depth, ']');
    };
    EXPECT_TRUE(parsedJson(nested(64)).has_value());
    EXPECT_FALSE(parsedJson(nested(65)).has_value());
    EXPECT_FALSE(parsedJson(nested(1'000'000)).has_value());
    EXPECT_TRUE(parsedJson("\"" + std::string(100, '[') + "\"").has_value());
}

TEST(JsonReadingTest, aMemberOfAnotherTypeIsNone) {
    const auto object = parsedJson(R"({"text":"a","number":7,"real":0.5,"yes":true,"list":[],)"
                                   R"("big":18446744073709551615,"negative":-1,"null":null})");
    ASSERT_TRUE(object.has_value());
    EXPECT_EQ(textMember(*object, "text"), "a");
    EXPECT_EQ(textMember(*object, "number"), std::nullopt);
    EXPECT_EQ(textMember(*object, "none"), std::nullopt);
    EXPECT_EQ(unsignedMember(*object, "number"), 7U);
    EXPECT_EQ(unsignedMember(*object, "negative"), std::nullopt);
    EXPECT_EQ(unsignedMember(*object, "real"), std::nullopt);
    EXPECT_EQ(numberMember(*object, "number"), Number(std::int64_t{7}));
    EXPECT_EQ(numberMember(*object, "negative"), Number(std::int64_t{-1}));
    EXPECT_EQ(numberMember(*object, "real"), Number(0.5));
    EXPECT_EQ(numberMember(*object, "big"), Number(std::uint64_t{18446744073709551615U}));
    EXPECT_EQ(booleanMember(*object, "yes"), true);
    EXPECT_EQ(booleanMember(*object, "number"), std::nullopt);
    EXPECT_NE(arrayMember(*object, "list"), nullptr);
    EXPECT_EQ(arrayMember(*object, "text"), nullptr);
    EXPECT_EQ(dateMember(*object, "text"), std::nullopt);
    EXPECT_EQ(dataMember(*object, "number"), std::nullopt);
    EXPECT_EQ(textMember(nlohmann::json(7), "text"), std::nullopt);
}

}  // namespace
}  // namespace marrowdale::host
