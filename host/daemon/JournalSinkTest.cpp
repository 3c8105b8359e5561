#include <array>
#include <cstring>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>
#include <vector>

#include <gtest/gtest.h>

#include "host/daemon/JournalSink.h"
#include "platform/testing/TemporaryDirectory.h"

namespace marrowdale::host {
namespace {

// A socket that stands in for the journal's.
class Journal {
  public:
    Journal() : socket_(::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0)) {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        path().copy(std::begin(address.sun_path), sizeof(address.sun_path) - 1);
        const auto* plain = reinterpret_cast<const sockaddr*>(&address);
        EXPECT_EQ(::bind(socket_.get(), plain, sizeof(address)), 0);
    }
    [[nodiscard]] std::string path() const { return folder_.path("socket"); }

    // One message: the datagram's bytes, or those of the file whose descriptor came with it.
    [[nodiscard]] std::string receive() const {
        std::vector<char> bytes(1U << 20U);
        alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(int))> control{};
        iovec part{bytes.data(), bytes.size()};
        msghdr header{};
        header.msg_iov = &part;
        header.msg_iovlen = 1;
        header.msg_control = control.data();
        header.msg_controllen = control.size();
        const ssize_t length = ::recvmsg(socket_.get(), &header, MSG_DONTWAIT);
        if (length < 0) {
            return "nothing came";
        }
        if (const cmsghdr* message = CMSG_FIRSTHDR(&header)) {
            int descriptor = -1;
            std::memcpy(&descriptor, CMSG_DATA(message), sizeof(int));
            return contents(native::UniqueFD(descriptor));
        }
        return {bytes.data(), static_cast<std::size_t>(length)};
    }

  private:
    static std::string contents(const native::UniqueFD& file) {
        std::string text(static_cast<std::size_t>(::lseek(file.get(), 0, SEEK_END)), '\0');
        EXPECT_EQ(::pread(file.get(), text.data(), text.size(), 0),
                  static_cast<ssize_t>(text.size()));
        return text;
    }
    TemporaryDirectory folder_;
    native::UniqueFD socket_;
};

TEST(JournalSinkTest, aLineGoesOutAsFieldsWithItsPriority) {
    const Journal journal;
    const auto sink = JournalSink::connect(journal.path());
    ASSERT_NE(sink, nullptr);
    sink->write(LogLevel::error, "[ERROR] a\nb");
    using namespace std::string_literals;
    EXPECT_EQ(journal.receive(),
              "PRIORITY=3\nSYSLOG_IDENTIFIER=marrowdale\nMESSAGE\n"
              "\x0B\0\0\0\0\0\0\0[ERROR] a\nb\n"s);
}

TEST(JournalSinkTest, eachLevelHasItsPriority) {
    EXPECT_TRUE(journalMessage(LogLevel::debug, "x").starts_with("PRIORITY=7\n"));
    EXPECT_TRUE(journalMessage(LogLevel::info, "x").starts_with("PRIORITY=6\n"));
}

TEST(JournalSinkTest, aNewlineInANameCanNotForgeAField) {
    using namespace std::string_literals;
    const std::string message = journalMessage(LogLevel::info, "a\nPRIORITY=0\nb");
    EXPECT_TRUE(message.ends_with("MESSAGE\n\x0E\0\0\0\0\0\0\0a\nPRIORITY=0\nb\n"s));
}

TEST(JournalSinkTest, aMessageTooLongForADatagramGoesThroughAMemoryFile) {
    const Journal journal;
    const auto sink = JournalSink::connect(journal.path());
    ASSERT_NE(sink, nullptr);
    const std::string line(4U << 20U, 'x');
    sink->write(LogLevel::info, line);
    EXPECT_EQ(journal.receive(), journalMessage(LogLevel::info, line));
}

TEST(JournalSinkTest, whereNoJournalListensThereIsNoSink) {
    const TemporaryDirectory folder;
    EXPECT_EQ(JournalSink::connect(folder.path("none")), nullptr);
    EXPECT_EQ(JournalSink::connect("/" + std::string(200, 'x')), nullptr);
}

}  // namespace
}  // namespace marrowdale::host
