#pragma once

#include <map>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFileSystems.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"
#include "tests/system/ChildProcess.h"

namespace marrowdale::tests {

using Json = nlohmann::json;
using Arguments = std::vector<std::string>;

// A person's home folder in a fresh temporary folder, and the program run in it. The storage root
// is the home's "Documents"; state and caches lie below the home, too.
class Home {
  public:
    // Below `parent`; by default where temporary files go.
    explicit Home(const std::string& parent = {});

    [[nodiscard]] std::string path(std::string_view name) const { return folder_.path(name); }
    [[nodiscard]] const std::string& root() const { return root_; }
    // Below the storage root.
    [[nodiscard]] std::string document(std::string_view name) const {
        return root_ + "/" + std::string(name);
    }

    // How the program is started with these arguments; tests may change it.
    [[nodiscard]] ChildOptions command(const Arguments& arguments) const;
    [[nodiscard]] ChildResult run(const Arguments& arguments) const;

    // Runs it with --json and reads its lines; a run that does not end with 0, or says anything on
    // standard error, fails the test.
    [[nodiscard]] std::vector<Json> lines(const Arguments& arguments) const;
    // The one line.
    [[nodiscard]] Json line(const Arguments& arguments) const;
    // Runs it with --json and answers the error it must end with.
    [[nodiscard]] Json error(const Arguments& arguments, int exitCode) const;

    // The identifier at a path below the storage root, and the path of an identifier.
    [[nodiscard]] std::string identifierOf(std::string_view name) const;
    [[nodiscard]] std::string pathOf(const std::string& identifier) const;
    // File names of a listing by identifier.
    [[nodiscard]] std::map<std::string, std::string> namesByIdentifier(
        const std::string& item) const;

  private:
    TemporaryDirectory folder_;
    std::string root_;
};

// The values of one line of machine output. Strings are the bytes that they stand for: \udcXX is
// the byte 0xXX.
[[nodiscard]] Json parsedLine(std::string_view line);
// Of whole lines only: what follows the last newline is left out.
[[nodiscard]] std::vector<Json> parsedLines(std::string_view output);

// The text of a field; a missing one fails the test.
[[nodiscard]] std::string text(const Json& value, const char* name);

// The field of each value.
[[nodiscard]] std::vector<std::string> field(const std::vector<Json>& values, const char* name);

// Runs on each file system that the tests are given.
class SystemTest : public ::testing::TestWithParam<TestFileSystem> {
  protected:
    Home home_{GetParam().dir};
};

}  // namespace marrowdale::tests

#define MARROWDALE_ON_EACH_FILE_SYSTEM(suite)                                                     \
    INSTANTIATE_TEST_SUITE_P(OnEach, suite, ::testing::ValuesIn(::marrowdale::testFileSystems()), \
                             ::marrowdale::testFileSystemName)
