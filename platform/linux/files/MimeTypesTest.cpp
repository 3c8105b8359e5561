#include <fstream>
#include <set>
#include <string>

#include <gio/gio.h>
#include <gtest/gtest.h>

#include "platform/linux/files/MimeTypes.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

class MimeTypesTest : public testing::Test {
  protected:
    std::string mime(const std::string& name, const std::string& globs) {
        const std::string path = folder_.path(name);
        makeFolder(path);
        writeFile(path + "/globs2", globs);
        return path;
    }
    TemporaryDirectory folder_;
};

TEST_F(MimeTypesTest, literalThenLongestSuffixThenWeight) {
    const MimeTypes types({mime("a",
                                "# comment\n"
                                "50:text/plain:*.txt\n"
                                "50:application/gzip:*.gz\n"
                                "50:application/x-tar-gz:*.tar.gz\n"
                                "50:text/x-makefile:makefile\n"
                                "40:image/low:*.dup\n"
                                "60:image/high:*.dup\n"
                                "50:application/x-backup:*~\n")});
    EXPECT_EQ(types.typeForName("a.txt"), "text/plain");
    EXPECT_EQ(types.typeForName("A.TXT"), "text/plain");
    EXPECT_EQ(types.typeForName("a.b.gz"), "application/gzip");
    EXPECT_EQ(types.typeForName("a.TAR.gz"), "application/x-tar-gz");
    EXPECT_EQ(types.typeForName("Makefile"), "text/x-makefile");
    EXPECT_EQ(types.typeForName("a makefile"), MimeTypes::unknown);
    EXPECT_EQ(types.typeForName("a.dup"), "image/high");
    EXPECT_EQ(types.typeForName("a.txt~"), "application/x-backup");
    EXPECT_EQ(types.typeForName("txt"), MimeTypes::unknown);
    EXPECT_EQ(types.typeForName(""), MimeTypes::unknown);
    EXPECT_EQ(types.typeForName("\xff\xfe.txt"), "text/plain");
    EXPECT_EQ(types.typeForName(std::string(300, 'x') + ".txt"), "text/plain");
}

TEST_F(MimeTypesTest, caseCountsWhereTheGlobSaysSo) {
    const MimeTypes types({mime("a",
                                "50:text/x-c:*.c:cs\n"
                                "50:text/x-c:*.c\n"
                                "50:text/x-c++:*.C:cs\n"
                                "50:text/x-c++:*.C\n"
                                "50:application/x-core:core:cs\n")});
    EXPECT_EQ(types.typeForName("a.c"), "text/x-c");
    EXPECT_EQ(types.typeForName("a.C"), "text/x-c++");
    EXPECT_EQ(types.typeForName("core"), "application/x-core");
    EXPECT_EQ(types.typeForName("CORE"), MimeTypes::unknown);
}

TEST_F(MimeTypesTest, otherPatterns) {
    const MimeTypes types({mime("a",
                                "10:text/x-readme:README*\n"
                                "50:video/x-anim:*.anim[1-9j]\n"
                                "50:video/vdr:[0-9][0-9][0-9].vdr\n"
                                "50:text/plain:*.txt\n"
                                "70:application/x-heavy:h*v?.txt\n")});
    EXPECT_EQ(types.typeForName("README"), "text/x-readme");
    EXPECT_EQ(types.typeForName("readme.now"), "text/x-readme");
    EXPECT_EQ(types.typeForName("README.txt"), "text/plain");
    EXPECT_EQ(types.typeForName("x.anim3"), "video/x-anim");
    EXPECT_EQ(types.typeForName("x.ANIMJ"), "video/x-anim");
    EXPECT_EQ(types.typeForName("x.anim0"), MimeTypes::unknown);
    EXPECT_EQ(types.typeForName("001.vdr"), "video/vdr");
    EXPECT_EQ(types.typeForName("heavy.txt"), "application/x-heavy");
}

TEST_F(MimeTypesTest, earlierFolderCountsMoreAndMayReplaceATypesGlobs) {
    const MimeTypes types({mime("user",
                                "50:text/mine:*.x\n"
                                "0:text/closed:__NOGLOBS__\n"
                                "50:text/closed:*.new\n"),
                           mime("system",
                                "50:text/theirs:*.x\n"
                                "50:text/closed:*.old\n")});
    EXPECT_EQ(types.typeForName("a.x"), "text/mine");
    EXPECT_EQ(types.typeForName("a.new"), "text/closed");
    EXPECT_EQ(types.typeForName("a.old"), MimeTypes::unknown);
}

TEST_F(MimeTypesTest, brokenDataIsPassedOver) {
    const MimeTypes none({folder_.path("missing")});
    EXPECT_EQ(none.typeForName("a.txt"), MimeTypes::unknown);
    const MimeTypes types({mime("a",
                                "50\n50:\n50:x\n::\nheavy:x/y:*.b\n50:x/y:\n50:x/y:[\n"
                                "50:x/y:*\\\n99999999999999999999:x/y:*.b\n50:ok/ok:*.ok")});
    EXPECT_EQ(types.typeForName("a.b"), MimeTypes::unknown);
    EXPECT_EQ(types.typeForName("a.ok"), "ok/ok");
}

TEST_F(MimeTypesTest, conformsThroughSubclassesAndAliases) {
    const std::string path = mime("a", "");
    writeFile(path + "/subclasses",
              "image/svg+xml application/xml\napplication/xml text/plain\na/a b/b\nb/b a/a\n");
    writeFile(path + "/aliases", "image/svg image/svg+xml\ntext/xml application/xml\n");
    const MimeTypes types({path});
    EXPECT_TRUE(types.conformsTo("image/svg", "text/xml"));
    EXPECT_TRUE(types.conformsTo("image/svg+xml", "text/plain"));
    EXPECT_TRUE(types.conformsTo("text/other", "text/plain"));
    EXPECT_TRUE(types.conformsTo("image/png", MimeTypes::unknown));
    EXPECT_FALSE(types.conformsTo("inode/directory", MimeTypes::unknown));
    EXPECT_TRUE(types.conformsTo("inode/directory", "inode/directory"));
    EXPECT_FALSE(types.conformsTo("text/plain", "application/xml"));
    EXPECT_FALSE(types.conformsTo("a/a", "c/c"));
}

std::string oracleType(const std::string& name) {
    gboolean uncertain = FALSE;
    char* type = g_content_type_guess(name.c_str(), nullptr, 0, &uncertain);
    std::string result = type;
    g_free(type);
    return result;
}

// Every glob of this system as a name that it matches.
std::set<std::string> namesOfEveryGlob() {
    std::set<std::string> names;
    std::ifstream file("/usr/share/mime/globs2");
    for (std::string line; std::getline(file, line);) {
        if (line.starts_with('#')) {
            continue;
        }
        const std::size_t glob = line.find(':', line.find(':') + 1) + 1;
        std::string name = line.substr(glob, line.find(':', glob) - glob);
        if (const auto set = name.find('['); set != std::string::npos) {
            continue;
        }
        for (auto star = name.find('*'); star != std::string::npos; star = name.find('*')) {
            name.replace(star, 1, "name");
        }
        names.insert(name);
    }
    return names;
}

TEST(MimeTypesOracleTest, agreesWithGIOOnEveryGlob) {
    const std::set<std::string> names = namesOfEveryGlob();
    if (names.empty()) {
        MARROWDALE_SKIP("shared-mime-info is not installed");
    }
    const MimeTypes types;
    int differing = 0;
    for (const std::string& name : names) {
        const std::string expected = oracleType(name);
        if (types.typeForName(name) != expected) {
            ++differing;
            ADD_FAILURE() << name << ": " << types.typeForName(name) << ", GIO: " << expected;
        }
    }
    EXPECT_EQ(differing, 0);
    EXPECT_GT(names.size(), 500U);
}

}  // namespace
}  // namespace marrowdale::native
