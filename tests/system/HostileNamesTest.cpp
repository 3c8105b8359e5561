#include <set>

#include <gmock/gmock.h>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

const std::vector<std::string>& hostileNames() {
    static const std::vector<std::string> names{
        "new\nline",
        "tab\tand\rreturn",
        "escape\x1B[31m",
        "\x80 no UTF-8 \xFF",
        "\xED\xB2\x80 an encoded surrogate",
        "\xC3 cut",
        "-rf",
        "--json",
        "\"quotes\" and \\backslashes\\",
        "\\udc80 written out",
        "%41 percent%",
        " blanks ",
        "caf\u00E9",
        "cafe\u0301",
        "\u202Eturned",
        "root",
        "did=1",
        "#hash",
        "$'x'",
        std::string(255, 'x'),
        std::string(127, '\xFE') + std::string(127, 'y'),
    };
    return names;
}

class HostileNamesTest : public SystemTest {};

MARROWDALE_ON_EACH_FILE_SYSTEM(HostileNamesTest);

TEST_P(HostileNamesTest, everyNameComesBackByteByByte) {
    for (const std::string& name : hostileNames()) {
        writeFile(home_.document(name), "x");
    }
    const auto items = home_.lines({"ls"});
    const auto listed = field(items, "filename");
    EXPECT_THAT(listed, ::testing::UnorderedElementsAreArray(hostileNames()));
    for (const Json& item : items) {
        const std::string identifier = item.at("itemIdentifier");
        EXPECT_EQ(item.at("path"), home_.document(text(item, "filename")));
        EXPECT_EQ(home_.pathOf(identifier), text(item, "path"));
        EXPECT_EQ(home_.line({"id", text(item, "path")})["itemIdentifier"], identifier);
    }
}

TEST_P(HostileNamesTest, foldersOfSuchNamesAreListed) {
    for (const std::string& name : hostileNames()) {
        makeFolder(home_.document(name));
        writeFile(home_.document(name) + "/inside", "x");
        const auto items = home_.lines({"ls", home_.document(name)});
        ASSERT_EQ(items.size(), 1U) << name;
        EXPECT_EQ(items[0].at("path"), home_.document(name) + "/inside");
    }
}

TEST_P(HostileNamesTest, theFormOfMachineOutputIsAcceptedBack) {
    writeFile(home_.document("a\x80z\xFF"), "x");
    const ChildResult listed = home_.run({"--json", "ls"});
    EXPECT_TRUE(listed.output.contains(R"("filename":"a\udc80z\udcff")")) << listed.output;
    const Json direct = home_.line({"info", "./a\x80z\xFF"});
    EXPECT_EQ(home_.line({"info", "./a\\udc80z\\udcff"}), direct);
    EXPECT_EQ(home_.line({"info", "./a\xED\xB2\x80z\xED\xB3\xBF"}), direct);
}

TEST_P(HostileNamesTest, aPathGoesIntoAPipeByteByByte) {
    const std::string path = home_.document("new\nline \xFF");
    writeFile(path, "x");
    const ChildResult result = home_.run({"path", path});
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.output, path + "\n");
}

}  // namespace
}  // namespace marrowdale::tests
