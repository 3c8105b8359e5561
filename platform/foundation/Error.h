#pragma once

#include <cstdint>
#include <expected>
#include <memory>
#include <string>
#include <string_view>

namespace marrowdale {

// Where an error's code has its meaning.
enum class ErrorDomain : std::uint8_t {
    posix,         // errno values
    file,          // general file errors: FileErrorCode
    fileProvider,  // the host framework's errors: FileProviderErrorCode
    provider,      // this provider's own kinds: ProviderErrorCode
};

// Codes of ErrorDomain::file.
enum class FileErrorCode : int {
    noSuchFile = 260,
    writeNoPermission = 513,
    fileExists = 516,
};

// What an error of one kind carries beyond its texts; each kind derives a type of its own (a file
// error 516 the URL in the way, the framework's collision the item there). Not changed once made.
struct ErrorUserInfo {
    ErrorUserInfo() = default;
    ErrorUserInfo(const ErrorUserInfo&) = delete;
    ErrorUserInfo& operator=(const ErrorUserInfo&) = delete;
    virtual ~ErrorUserInfo() = default;
};

// An error as a value. `operation` and `subject` say what was being done to which path or
// identifier; both may be empty ("no user info"). Plain data, copyable, usable from any thread.
struct Error {
    ErrorDomain domain = ErrorDomain::posix;
    int code = 0;
    std::string operation;  // "open", "read attributes of", …
    std::string subject;    // path (bytes as the system has them) or identifier
    std::shared_ptr<const ErrorUserInfo> userInfo = nullptr;  // null for most

    // The domain's name as it appears in machine output.
    [[nodiscard]] std::string_view domainName() const;

    // One line for people: what failed, on what, and why.
    [[nodiscard]] std::string description() const;

    // Equal when domain and code are; the user info is for people.
    friend bool operator==(const Error& a, const Error& b) {
        return a.domain == b.domain && a.code == b.code;
    }
};

// An error in the POSIX domain with the given code and no user info.
[[nodiscard]] Error errorWithPOSIXCode(int code);
// The same, telling what failed on what.
[[nodiscard]] Error errorWithPOSIXCode(int code, std::string_view operation,
                                       std::string_view subject);
// The general file-error domain's 513 (write not permitted), no user info.
[[nodiscard]] Error errorFileWriteNoPermission();

// A value or an Error; std::expected that may not be ignored.
template <typename T>
struct [[nodiscard]] Expected : std::expected<T, Error> {
    using std::expected<T, Error>::expected;
};

using Unexpected = std::unexpected<Error>;

}  // namespace marrowdale
