#include <cerrno>

#include <gtest/gtest.h>

#include "platform/foundation/Utf8.h"
#include "platform/linux/operations/ItemNames.h"

namespace marrowdale::native {
namespace {

constexpr auto inside = NumberPlace::beforeExtension;

TEST(ItemNamesTest, refusesWhatIsNoName) {
    const auto codeOf = [](std::string_view name) {
        const auto checked = checkName(name, "rename");
        return checked ? 0 : checked.error().code;
    };
    for (const std::string_view name :
         {std::string_view(), std::string_view("."), std::string_view(".."),
          std::string_view("a/b"), std::string_view("/"), std::string_view("a\0b", 3)}) {
        EXPECT_EQ(codeOf(name), EINVAL) << name;
    }
    EXPECT_EQ(codeOf(std::string(256, 'x')), ENAMETOOLONG);
    for (const std::string& name :
         {std::string(255, 'x'), std::string("..."), std::string("\xff\n\x1b"), std::string(" ")}) {
        EXPECT_EQ(codeOf(name), 0) << name;
    }
    const auto checked = checkName("a/b", "rename");
    EXPECT_EQ(checked.error().operation, "rename");
    EXPECT_EQ(checked.error().subject, "a/b");
}

TEST(ItemNamesTest, aNumberGoesBeforeTheExtension) {
    EXPECT_EQ(numberedName("a.txt", 2, inside), "a 2.txt");
    EXPECT_EQ(numberedName("a.tar.gz", 10, inside), "a.tar 10.gz");
    EXPECT_EQ(numberedName("a", 2, inside), "a 2");
    EXPECT_EQ(numberedName(".profile", 2, inside), ".profile 2");
    EXPECT_EQ(numberedName("a.", 2, inside), "a. 2");
    EXPECT_EQ(numberedName("Dr. Who", 2, inside), "Dr. Who 2");
    EXPECT_EQ(numberedName("folder.d", 2, NumberPlace::atEnd), "folder.d 2");
}

TEST(ItemNamesTest, aLongNameIsCutBetweenCharacters) {
    std::string umlauts;
    for (int i = 0; i < 125; ++i) {
        umlauts += "ä";
    }
    const std::string name = umlauts + ".text";
    ASSERT_EQ(name.size(), 255U);
    const std::string numbered = numberedName(name, 2, inside);
    EXPECT_LE(numbered.size(), longestName);
    EXPECT_TRUE(numbered.ends_with("ä 2.text"));
    EXPECT_TRUE(isUtf8(numbered));
    // Bytes that are no characters are cut anywhere.
    EXPECT_EQ(numberedName(std::string(255, '\x80'), 2, inside).size(), longestName);
    // What is too long for an extension is none.
    const std::string tail = "a." + std::string(253, 'x');
    EXPECT_EQ(numberedName(tail, 2, inside), tail.substr(0, 253) + " 2");
}

TEST(ItemNamesTest, everyNumberedNameHasTheCommonStart) {
    for (const std::string& name : {std::string("a.txt"), std::string(255, 'x'),
                                    std::string(250, 'x') + ".text", std::string(".x")}) {
        for (const std::uint64_t number : {2ULL, 99999ULL, 18446744073709551615ULL}) {
            EXPECT_TRUE(numberedName(name, number, inside).starts_with(commonStart(name, inside)))
                << name << number;
            EXPECT_LE(numberedName(name, number, inside).size(), longestName);
        }
    }
}

}  // namespace
}  // namespace marrowdale::native
