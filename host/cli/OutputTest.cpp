#include <array>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "host/cli/Output.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {
namespace {

TEST(OutputTest, whatWasGatheredAppearsWhenFlushed) {
    std::array<int, 2> ends{};
    ASSERT_EQ(::pipe(ends.data()), 0);
    const native::UniqueFD reader(ends[0]);
    const native::UniqueFD writer(ends[1]);
    Output output(writer.get());
    output.write("a");
    output.writeLine("b");
    output.flush();
    std::array<char, 16> buffer{};
    ASSERT_EQ(::read(reader.get(), buffer.data(), buffer.size()), 3);
    EXPECT_EQ(std::string_view(buffer.data(), 3), "ab\n");
    EXPECT_FALSE(output.hasFailed());
}

TEST(OutputTest, aReaderThatHasGoneIsNoError) {
    std::signal(SIGPIPE, SIG_IGN);
    std::array<int, 2> ends{};
    ASSERT_EQ(::pipe(ends.data()), 0);
    ::close(ends[0]);
    const native::UniqueFD writer(ends[1]);
    Output output(writer.get());
    output.write("x");
    output.flush();
    EXPECT_TRUE(output.readerHasGone());
    EXPECT_TRUE(output.hasFailed());
    EXPECT_EQ(output.error(), 0);
}

TEST(OutputTest, aFullDiskIsAnError) {
    const native::UniqueFD full(::open("/dev/full", O_WRONLY | O_CLOEXEC));
    ASSERT_TRUE(full);
    Output output(full.get());
    output.write("x");
    EXPECT_EQ(output.error(), 0);
    output.flush();
    EXPECT_EQ(output.error(), ENOSPC);
}

}  // namespace
}  // namespace marrowdale::host
