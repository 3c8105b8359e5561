#include <array>
#include <unistd.h>

#include <gtest/gtest.h>

#include "host/daemon/StandardErrorSink.h"

namespace marrowdale::host {
namespace {

std::string written(std::string_view line) {
    std::array<int, 2> ends{};
    EXPECT_EQ(::pipe(ends.data()), 0);
    StandardErrorSink(ends[1]).write(LogLevel::error, line);
    ::close(ends[1]);
    std::array<char, 4096> buffer{};
    const ssize_t length = ::read(ends[0], buffer.data(), buffer.size());
    ::close(ends[0]);
    return {buffer.data(), static_cast<std::size_t>(length)};
}

TEST(StandardErrorSinkTest, aLineIsWrittenWithANewline) {
    EXPECT_EQ(written("[INFO] hello"), "[INFO] hello\n");
}

TEST(StandardErrorSinkTest, aNameCanNeitherForgeALineNorDriveTheTerminal) {
    EXPECT_EQ(written("[ERROR] \"a\n[ERROR] b\x1B[2J\xFF\""),
              "[ERROR] \"a\\n[ERROR] b\\e[2J\\xff\"\n");
}

TEST(StandardErrorSinkTest, aDescriptorThatIsClosedIsNoTrouble) {
    StandardErrorSink(-1).write(LogLevel::error, "[ERROR] lost");
}

}  // namespace
}  // namespace marrowdale::host
