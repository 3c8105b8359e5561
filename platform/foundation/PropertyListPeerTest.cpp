// The same lists read and written by another implementation: Python's standard plistlib.

#include <array>
#include <cstdio>
#include <memory>
#include <optional>
#include <string>

#include <gtest/gtest.h>

#include "platform/foundation/HexDigits.h"
#include "platform/foundation/PropertyListExamples.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale {
namespace {

// What a command prints, without the newline at its end; no value when it fails.
std::optional<std::string> outputOf(const std::string& command) {
    std::FILE* pipe = popen(command.c_str(), "r");
    if (pipe == nullptr) {
        return std::nullopt;
    }
    std::string output;
    std::array<char, 4096> buffer{};
    while (const std::size_t count = std::fread(buffer.data(), 1, buffer.size(), pipe)) {
        output.append(buffer.data(), count);
    }
    if (pclose(pipe) != 0) {
        return std::nullopt;
    }
    if (output.ends_with('\n')) {
        output.pop_back();
    }
    return output;
}

// Runs statements; they may hold no single quote.
std::optional<std::string> python(const std::string& statements) {
    return outputOf("python3 -c 'import plistlib, datetime\n" + statements + "'");
}

std::string hex(const Data& data) {
    std::string text;
    for (const std::uint8_t byte : data.bytes()) {
        text += upperCaseHexDigits[byte >> 4];
        text += upperCaseHexDigits[byte & 0x0F];
    }
    return text;
}

Data fromHex(std::string_view text) {
    Bytes bytes;
    for (std::size_t i = 0; i + 1 < text.size(); i += 2) {
        const int high = hexDigitValue(text[i]).value();
        const int low = hexDigitValue(text[i + 1]).value();
        bytes.push_back(static_cast<std::uint8_t>(high << 4 | low));
    }
    return Data(std::move(bytes));
}

struct Peers {
    const char* name;
    PropertyList list;
    const char* expression;  // the same in Python
};

PropertyList integers() {
    PropertyListArray array;
    for (const std::int64_t integer :
         {std::int64_t{0}, std::int64_t{255}, std::int64_t{256}, std::int64_t{65'535},
          std::int64_t{65'536}, std::int64_t{1} << 31, std::int64_t{1} << 32,
          std::numeric_limits<std::int64_t>::max(), std::int64_t{-1},
          std::numeric_limits<std::int64_t>::min()}) {
        array.emplace_back(integer);
    }
    array.emplace_back(std::uint64_t{1} << 63);
    array.emplace_back(std::numeric_limits<std::uint64_t>::max());
    return PropertyList(std::move(array));
}

PropertyList lengths() {
    PropertyListArray array;
    for (const std::size_t length : {0U, 14U, 15U, 255U, 256U, 4'000U}) {
        array.emplace_back(std::string(length, 'a'));
        array.emplace_back(Data(Bytes(length, 'a')));
        std::string wide;
        for (std::size_t i = 0; i < length; ++i) {
            wide += "\xC3\xA4";
        }
        array.emplace_back(std::move(wide));
        array.emplace_back(PropertyListArray(length, PropertyList(true)));
    }
    return PropertyList(std::move(array));
}

class PropertyListPeerTest : public testing::TestWithParam<Peers> {
  protected:
    void SetUp() override {
        if (!python("pass")) {
            MARROWDALE_SKIP("needs python3 with its standard library (plistlib)");
        }
    }
};

TEST_P(PropertyListPeerTest, readsWhatWeWrite) {
    const auto encoded = encodePropertyList(GetParam().list);
    ASSERT_TRUE(encoded);
    const auto answer = python("print(plistlib.loads(bytes.fromhex(\"" + hex(*encoded) +
                               "\")) == " + GetParam().expression + ")");
    EXPECT_EQ(answer, "True");
}

TEST_P(PropertyListPeerTest, writesWhatWeRead) {
    const auto written = python(std::string("print(plistlib.dumps(") + GetParam().expression +
                                ", fmt=plistlib.FMT_BINARY).hex())");
    ASSERT_TRUE(written);
    const auto decoded = decodePropertyList(fromHex(*written).bytes());
    ASSERT_TRUE(decoded) << decoded.error().description();
    EXPECT_EQ(*decoded, GetParam().list);
}

INSTANTIATE_TEST_SUITE_P(
    Lists, PropertyListPeerTest,
    testing::Values(
        Peers{"nontrivial", PropertyListExamples::nontrivial(),
              R"({"array": [{"label": "\u00E4 \U0001F600", "color": 6},
                            {"label": "\u00E4 \U0001F600", "color": 6},
                            ["label"], 2**64 - 1, -300, 100000],
                  "data": b"some bytes that need a long count",
                  "date": datetime.datetime(2026, 1, 31, 23, 59, 59, 500000),
                  "real": -0.25, "true": True, "false": False, "empty": {}})"},
        Peers{"integers", integers(),
              "[0, 255, 256, 65535, 65536, 2**31, 2**32, 2**63 - 1, -1, -2**63, 2**63, 2**64 - 1]"},
        Peers{"lengths", lengths(),
              R"([value for length in (0, 14, 15, 255, 256, 4000)
                  for value in ("a" * length, b"a" * length, "\u00E4" * length, [True] * length)])"}),
    [](const auto& test) { return std::string(test.param.name); });

}  // namespace
}  // namespace marrowdale
