#include "platform/testing/TestFileSystems.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <ostream>

namespace marrowdale {

void PrintTo(const TestFileSystem& fileSystem, std::ostream* stream) {
    *stream << fileSystem.name << "=" << fileSystem.dir;
}

std::vector<TestFileSystem> parseTestFileSystems(std::string_view text) {
    std::vector<TestFileSystem> fileSystems;
    for (;;) {
        const std::string_view pair = text.substr(0, text.find(':'));
        const std::size_t equals = pair.find('=');
        const bool wellFormed = equals != std::string_view::npos && equals > 0 &&
                                equals + 1 < pair.size() && pair[equals + 1] == '/';
        if (!wellFormed) {
            return {};
        }
        fileSystems.push_back(
            {std::string(pair.substr(0, equals)), std::string(pair.substr(equals + 1))});
        if (pair.size() == text.size()) {
            return fileSystems;
        }
        text.remove_prefix(pair.size() + 1);
    }
}

std::vector<TestFileSystem> testFileSystems() {
    const char* text = std::getenv("MARROWDALE_TEST_DIRS");  // NOLINT(concurrency-mt-unsafe)
    if (text == nullptr || *text == '\0') {
        return {{"tmp", std::filesystem::temp_directory_path().string()}};
    }
    std::vector<TestFileSystem> fileSystems = parseTestFileSystems(text);
    if (fileSystems.empty()) {
        std::fprintf(stderr, "MARROWDALE_TEST_DIRS is not name=/dir[:name=/dir…]: %s\n", text);
        std::exit(2);  // NOLINT(concurrency-mt-unsafe)
    }
    return fileSystems;
}

}  // namespace marrowdale
