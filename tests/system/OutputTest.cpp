#include <cerrno>
#include <fcntl.h>
#include <unistd.h>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

// What the store says of itself: its UUID first, then when it was made.
std::string storeOf(const Home& home) {
    for (const Json& finding : home.lines({"doctor"})) {
        if (finding.at("finding") == "store") {
            const std::string message = text(finding, "message");
            return message.substr(0, message.find(", last event"));
        }
    }
    return {};
}

TEST(OutputTest, aReaderThatGoesAwayEndsAListingQuietly) {
    const Home home;
    for (int i = 0; i < 1000; ++i) {
        writeFile(home.document(std::string(200, 'x') + std::to_string(i)), "");
    }
    ChildProcess process(home.command({"ls", "--json"}));
    process.readOutput(1, std::chrono::seconds(60));
    process.closeOutput();
    const ChildResult result = process.finish();
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.signal, 0);
    EXPECT_EQ(result.errors, "");
    EXPECT_EQ(home.lines({"ls"}).size(), 1000U);
}

TEST(OutputTest, aFullDiskIsAnError) {
    const Home home;
    writeFile(home.document("a"), "");
    for (const Arguments& arguments :
         {Arguments{"ls", "--json"}, Arguments{"info", "root", "--json"},
          Arguments{"--help", "--json"}, Arguments{"--version", "--json"}}) {
        native::UniqueFD full(::open("/dev/full", O_WRONLY | O_CLOEXEC));
        ASSERT_TRUE(full);
        const ChildResult result = ChildProcess(home.command(arguments), std::move(full)).finish();
        EXPECT_EQ(result.exitCode, 1);
        EXPECT_EQ(parsedLines(result.errors).at(0)["error"]["code"], ENOSPC);
    }
}

// The store's own files must never get the numbers of standard streams.
TEST(OutputTest, aProgramStartedWithoutStandardStreamsHarmsNothing) {
    const Home home;
    writeFile(home.document("a"), "");
    writeFile(home.document("b"), "");
    const auto before = home.lines({"ls"});
    const std::string store = storeOf(home);
    for (unsigned closed = 1; closed < 8; ++closed) {
        for (const Arguments& arguments : {Arguments{"ls", "--json"}, Arguments{"ls", "--verbose"},
                                           Arguments{"path", "did=0"}}) {
            ChildOptions options = home.command(arguments);
            for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
                if (((closed >> static_cast<unsigned>(descriptor)) & 1U) != 0) {
                    options.closedDescriptors.push_back(descriptor);
                }
            }
            const ChildResult result = runChild(options);
            // What can't be told has failed.
            const bool isTold = arguments.front() == "ls" && (closed & 2U) == 0;
            EXPECT_EQ(result.exitCode, isTold ? 0 : 1) << closed << " " << result.errors;
            EXPECT_EQ(result.output.empty(), !isTold) << closed;
        }
    }
    EXPECT_EQ(storeOf(home), store);
    EXPECT_EQ(home.lines({"ls"}), before);
}

TEST(OutputTest, noColourGoesIntoAPipe) {
    const Home home;
    makeFolder(home.document("folder"));
    ChildOptions options = home.command({"ls"});
    options.variables["TERM"] = "xterm";
    EXPECT_EQ(runChild(options).output.find('\x1B'), std::string::npos);
}

}  // namespace
}  // namespace marrowdale::tests
