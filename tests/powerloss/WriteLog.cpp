#include "tests/powerloss/WriteLog.h"

#include <cerrno>
#include <new>
#include <sys/mman.h>
#include <system_error>

namespace marrowdale::tests {

void WriteLog::Unmap::operator()(Shared* shared) const {
    ::munmap(shared, sizeof(Shared));
}

WriteLog::WriteLog() : file_(0) {
    void* memory =
        ::mmap(nullptr, sizeof(Shared), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    if (memory == MAP_FAILED) {
        throw std::system_error(errno, std::generic_category(), "share memory");
    }
    shared_.reset(new (memory) Shared{});
}

void WriteLog::add(Entry entry, std::span<const std::byte> bytes) {
    entry.contents = shared_->end + sizeof(Entry);
    file_.write(std::as_bytes(std::span(&entry, 1)), shared_->end);
    file_.write(bytes, entry.contents);
    shared_->end = entry.contents + bytes.size();
    ++shared_->count;
}

void WriteLog::addWrite(std::span<const std::byte> bytes, std::uint64_t offset) {
    add({Entry::Kind::write, static_cast<std::uint32_t>(bytes.size()), offset, 0}, bytes);
}

void WriteLog::addFlush() {
    add({Entry::Kind::flush, 0, 0, 0}, {});
}

std::vector<WriteLog::Entry> WriteLog::entries() const {
    std::vector<Entry> entries(size());
    std::uint64_t at = 0;
    for (Entry& entry : entries) {
        file_.read(std::as_writable_bytes(std::span(&entry, 1)), at);
        at = entry.contents + entry.length;
    }
    return entries;
}

std::vector<std::byte> WriteLog::contents(const Entry& entry) const {
    std::vector<std::byte> bytes(entry.length);
    file_.read(bytes, entry.contents);
    return bytes;
}

}  // namespace marrowdale::tests
