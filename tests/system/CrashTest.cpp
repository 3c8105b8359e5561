#include <map>
#include <random>

#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

class CrashTest : public SystemTest {
  protected:
    // Lists, and is killed once that much was read, or after that time if nothing is to be read.
    [[nodiscard]] std::vector<Json> listAndKill(std::size_t bytes,
                                                std::chrono::milliseconds time) const {
        ChildProcess process(home_.command({"ls", "--json"}));
        process.readOutput(bytes, time);
        process.kill();
        return parsedLines(process.finish().output);
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(CrashTest);

TEST_P(CrashTest, whatAKilledListingHandedOutHoldsForEver) {
    std::mt19937 random(GetParam().name.size());
    std::map<std::string, std::string> handedOut;
    int made = 0;
    for (int round = 0; round < 50; ++round) {
        for (int i = 0; i < 60; ++i) {
            writeFile(home_.document("file " + std::to_string(made++)), "");
        }
        const bool readsSome = round % 2 == 0;
        const auto items = readsSome
                               ? listAndKill(1 + random() % 200'000, std::chrono::seconds(60))
                               : listAndKill(SIZE_MAX, std::chrono::milliseconds(random() % 30));
        for (const Json& item : items) {
            const auto [known, isNew] =
                handedOut.emplace(item.at("itemIdentifier"), item.at("filename"));
            EXPECT_EQ(known->second, text(item, "filename")) << known->first;
        }
    }
    ASSERT_FALSE(handedOut.empty());
    const auto names = home_.namesByIdentifier("root");
    EXPECT_EQ(names.size(), static_cast<std::size_t>(made));
    for (const auto& [identifier, name] : handedOut) {
        EXPECT_EQ(names.contains(identifier) ? names.at(identifier) : "gone", name) << identifier;
    }
    // The store was mended, not made anew.
    for (const Json& finding : home_.lines({"doctor"})) {
        if (finding.at("finding") == "rebuild") {
            EXPECT_EQ(finding.at("status"), "ok") << finding;
        }
    }
}

TEST_P(CrashTest, twoListingsAtOnceBothEndWell) {
    for (int i = 0; i < 2000; ++i) {
        writeFile(home_.document("file " + std::to_string(i)), "");
    }
    // The first can't end before its output is read: it has the store while the second starts.
    ChildProcess first(home_.command({"ls", "--json"}));
    ASSERT_FALSE(first.readOutput(1, std::chrono::seconds(60)).empty());
    ChildProcess second(home_.command({"ls", "--json"}));
    const ChildResult firstResult = first.finish();
    const ChildResult secondResult = second.finish();
    EXPECT_EQ(firstResult.exitCode, 0) << firstResult.errors;
    EXPECT_EQ(secondResult.exitCode, 0) << secondResult.errors;
    EXPECT_EQ(firstResult.output, secondResult.output);
    EXPECT_EQ(firstResult.errors + secondResult.errors, "");
}

// What programs read is left alone; twoListingsAtOnceBothEndWell would see it on standard error.
TEST_P(CrashTest, peopleAreToldForWhichProcessACommandWaits) {
    for (int i = 0; i < 2000; ++i) {
        writeFile(home_.document("file " + std::to_string(i)), "");
    }
    ChildProcess first(home_.command({"ls", "--json"}));
    ASSERT_FALSE(first.readOutput(1, std::chrono::seconds(60)).empty());
    ChildProcess second(home_.command({"info", "root"}));
    const std::string line = "marrowdale: waiting for process " + std::to_string(first.number()) +
                             ", which has the state folder\n";
    EXPECT_EQ(second.readErrors(line, std::chrono::seconds(60)), line);
    first.kill();
    const ChildResult result = second.finish();
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.errors, line);
}

TEST_P(CrashTest, manyAtOnceGiveOneIdentifierToOneDocument) {
    for (int i = 0; i < 100; ++i) {
        writeFile(home_.document("file " + std::to_string(i)), "");
    }
    std::vector<std::unique_ptr<ChildProcess>> processes;
    for (int i = 0; i < 8; ++i) {
        processes.push_back(std::make_unique<ChildProcess>(home_.command({"ls", "--json"})));
    }
    std::string expected;
    for (const auto& process : processes) {
        const ChildResult result = process->finish();
        EXPECT_EQ(result.exitCode, 0) << result.errors;
        expected = expected.empty() ? result.output : expected;
        EXPECT_EQ(result.output, expected);
    }
    EXPECT_EQ(parsedLines(expected).size(), 100U);
}

}  // namespace
}  // namespace marrowdale::tests
