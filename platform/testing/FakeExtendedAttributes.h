#pragma once

#include <cerrno>
#include <map>
#include <string>
#include <utility>

#include "platform/services/ExtendedAttributes.h"

namespace marrowdale {

// Attributes without a disk: those of every path in memory, and an error for each operation that a
// test wants to fail. One thread.
class FakeExtendedAttributes : public ExtendedAttributes {
  public:
    // By path and name.
    std::map<std::pair<std::string, std::string>, Data> values;
    int sizeError = 0;  // errno; 0 for none
    int readError = 0;
    int setError = 0;
    int removeError = 0;

    Expected<std::size_t> size(const URL& url, std::string_view name) override {
        if (sizeError != 0) {
            return Unexpected(errorWithPOSIXCode(sizeError));
        }
        const auto entry = values.find({url.path(), std::string(name)});
        if (entry == values.end()) {
            return Unexpected(errorWithPOSIXCode(ENODATA));
        }
        return entry->second.size();
    }
    Expected<Data> read(const URL& url, std::string_view name, std::size_t /*room*/) override {
        if (readError != 0) {
            return Unexpected(errorWithPOSIXCode(readError));
        }
        return values.at({url.path(), std::string(name)});
    }
    Expected<void> set(const OpenFile& file, std::string_view name, const Data& value) override {
        if (setError != 0) {
            return Unexpected(errorWithPOSIXCode(setError));
        }
        values[{file.url().path(), std::string(name)}] = value;
        return {};
    }
    Expected<void> remove(const OpenFile& file, std::string_view name) override {
        if (removeError != 0) {
            return Unexpected(errorWithPOSIXCode(removeError));
        }
        if (values.erase({file.url().path(), std::string(name)}) == 0) {
            return Unexpected(errorWithPOSIXCode(ENODATA));
        }
        return {};
    }
};

// Opens everything for writing.
class FakeWriteAccess : public WriteAccess {
  public:
    Expected<std::unique_ptr<OpenFile>> openForWriting(const URL& url) override;
};

}  // namespace marrowdale
