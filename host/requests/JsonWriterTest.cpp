#include <limits>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "host/requests/JsonWriter.h"

namespace marrowdale::host {
namespace {

std::string jsonString(std::string_view text) {
    std::string out;
    appendJsonString(out, text);
    return out;
}

TEST(JsonWriterTest, valuesAreSeparatedWhereTheyMustBe) {
    JsonWriter writer;
    writer.beginObject().key("a").beginArray().number(std::int64_t{-1}).string("x").endArray();
    writer.key("b").beginObject().endObject().key("c").null().key("d").boolean(false).endObject();
    EXPECT_EQ(writer.take(), R"({"a":[-1,"x"],"b":{},"c":null,"d":false})");
    EXPECT_EQ(writer.boolean(true).take(), "true");
}

TEST(JsonWriterTest, numbersAreWrittenInFull) {
    constexpr auto big = std::numeric_limits<std::uint64_t>::max();
    constexpr auto small = std::numeric_limits<std::int64_t>::min();
    EXPECT_EQ(JsonWriter().number(big).take(), "18446744073709551615");
    EXPECT_EQ(JsonWriter().number(small).take(), "-9223372036854775808");
    EXPECT_EQ(JsonWriter().number(0.1).take(), "0.1");
    EXPECT_EQ(nlohmann::json::parse(JsonWriter().number(1e300).take()), 1e300);
}

TEST(JsonWriterTest, aByteThatIsNoUTF8IsALowSurrogate) {
    EXPECT_EQ(jsonString("a\x80z\xFF"), "\"a\\udc80z\\udcff\"");
    EXPECT_EQ(jsonString("\xED\xB2\x80"), "\"\\udced\\udcb2\\udc80\"");
    EXPECT_EQ(jsonString("\xE2\x82"), "\"\\udce2\\udc82\"");
}

TEST(JsonWriterTest, nothingThatSomeReaderTakesForTheEndOfALineIsLeft) {
    EXPECT_EQ(jsonString("a\nb\u0085\u2028\u2029"), R"("a\nb\u0085\u2028\u2029")");
}

TEST(JsonWriterTest, everyUTF8TextReadsBackAsItself) {
    std::string all;
    for (char c = 1; c > 0; ++c) {
        all += c;
        if (c == 0x7F) {
            break;
        }
    }
    all += "\u00E9\u20AC\U0001F600\uFFFF\uE000";
    const std::string text = jsonString(all);
    EXPECT_EQ(nlohmann::json::parse(text).get<std::string>(), all);
    EXPECT_EQ(text.find('\n'), std::string::npos);
    EXPECT_EQ(nlohmann::json::parse(jsonString(std::string_view("\0", 1))).get<std::string>(),
              std::string(1, '\0'));
}

}  // namespace
}  // namespace marrowdale::host
