#include <filesystem>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/cli/ItemArgument.h"
#include "host/daemon/LocalRequests.h"
#include "host/testing/FakeExtension.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"

namespace marrowdale::host {
namespace {

class ItemArgumentTest : public ::testing::Test {
  protected:
    ItemArgumentTest() { makeFolder(root_ + "/sub"); }

    // The identifier, or the text of the error.
    [[nodiscard]] std::string look(std::string_view text) {
        const auto identifier = ItemArgument(std::string(text)).identifier(requests_, environment_);
        return identifier ? *identifier : "error: " + identifier.error().subject;
    }
    [[nodiscard]] std::string lookPath(std::string_view path) {
        const auto identifier = identifierOfPath(path, requests_, environment_);
        return identifier ? *identifier : "error: " + identifier.error().subject;
    }

    TemporaryDirectory folder_;
    std::string root_ = folder_.path("root");
    Environment environment_{{}, folder_.path("root/sub")};
    FakeExtension extension_;
    SignalHub signals_;
    LocalRequests requests_{{.extension = extension_,
                             .signals = signals_,
                             .rootPath = root_,
                             .replicaPath = ":memory:",
                             .stateFolder = {},
                             .findings = [] { return std::vector<Finding>{}; }}};
};

TEST_F(ItemArgumentTest, wordsAreContainersAndEverythingElseIsAnIdentifier) {
    EXPECT_EQ(look("root"), VantrelRootContainerItemIdentifier);
    EXPECT_EQ(look("working-set"), VantrelWorkingSetContainerItemIdentifier);
    EXPECT_EQ(look("all-directories"), VantrelAllDirectoriesContainerItemIdentifier);
    for (const char* text : {"did=12", "#org.example.Notes", "Root", "a.txt", "", ".", "..", ".x",
                             "-", "did=\n", "\xFF"}) {
        EXPECT_EQ(look(text), text);
    }
    EXPECT_THAT(extension_.askedPaths, ::testing::IsEmpty());
}

TEST_F(ItemArgumentTest, pathsAreLookedUpByTheirPlace) {
    extension_.add("did=1", root_ + "/sub/a");
    extension_.add("did=2", root_ + "/b");
    extension_.add("fid=3", root_ + "/sub");
    EXPECT_EQ(look(root_ + "/sub/a"), "did=1");
    EXPECT_EQ(look("./a"), "did=1");
    EXPECT_EQ(look("../b"), "did=2");
    EXPECT_EQ(look("./"), "fid=3");
    EXPECT_EQ(look("./."), "fid=3");
    EXPECT_EQ(look("../sub//"), "fid=3");
    EXPECT_EQ(look("/" + root_ + "/./sub/../b"), "did=2");
    EXPECT_EQ(lookPath("a"), "did=1");
    EXPECT_EQ(lookPath("."), "fid=3");
}

TEST_F(ItemArgumentTest, whatIsNotThereIsNamedAsItWasTyped) {
    EXPECT_EQ(look("./none"), "error: ./none");
    EXPECT_EQ(look("/no/such/folder/x"), "error: /no/such/folder/x");
    EXPECT_EQ(lookPath(""), "error: ");
}

TEST_F(ItemArgumentTest, theStorageRootsOwnPathIsTheRoot) {
    std::filesystem::create_directory_symlink(root_, folder_.path("Documents"));
    EXPECT_EQ(look(root_), VantrelRootContainerItemIdentifier);
    EXPECT_EQ(look(root_ + "//"), VantrelRootContainerItemIdentifier);
    EXPECT_EQ(look("../"), VantrelRootContainerItemIdentifier);
    EXPECT_EQ(look(folder_.path("Documents")), VantrelRootContainerItemIdentifier);
}

TEST_F(ItemArgumentTest, aLinkOnTheWayIsResolvedAndOneAtTheEndIsAnItem) {
    std::filesystem::create_directory_symlink(root_, folder_.path("Documents"));
    std::filesystem::create_directory_symlink(root_, root_ + "/loop");
    extension_.add("did=1", root_ + "/sub/a");
    extension_.add("did=2", root_ + "/loop");
    EXPECT_EQ(look(folder_.path("Documents/sub/a")), "did=1");
    EXPECT_EQ(look(root_ + "/loop/loop/sub/a"), "did=1");
    EXPECT_EQ(look(root_ + "/loop"), "did=2");
    EXPECT_EQ(look(root_ + "/loop/loop"), "did=2");
}

TEST_F(ItemArgumentTest, bytesThatAreNoUTF8AreAcceptedInTheFormOfMachineOutput) {
    extension_.add("did=1", root_ + "/sub/a\x80z");
    EXPECT_EQ(look("./a\x80z"), "did=1");
    EXPECT_EQ(look("./a\\udc80z"), "did=1");
    EXPECT_EQ(look("./a\xED\xB2\x80z"), "did=1");
    // A name that really has such a text wins.
    extension_.add("did=2", root_ + "/sub/a\\udc80z");
    EXPECT_EQ(look("./a\\udc80z"), "did=2");
}

TEST(WithBytesOfSurrogatesTest, onlySurrogatesThatStandForAByteAreTaken) {
    EXPECT_EQ(withBytesOfSurrogates("x\\udcffy\\uDC80"), "x\xFFy\x80");
    EXPECT_EQ(withBytesOfSurrogates("\xED\xB3\xBF\xED\xB2\x80"), "\xFF\x80");
    for (const char* text : {"", "plain", "\\udc7f", "\\udc8", "\\udcgg", "\\ud800", "\\udd80",
                             "\xED\xB1\x80", "\xED\xB4\x80", "\xED\xB2"}) {
        EXPECT_EQ(withBytesOfSurrogates(text), std::nullopt) << text;
    }
}

}  // namespace
}  // namespace marrowdale::host
