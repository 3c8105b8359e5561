#pragma once

#include <cstddef>
#include <cstdint>
#include <expected>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace marrowdale::host {

// Why bytes are no request that the document browser's listener takes. The value is the status that
// it is answered with.
enum class HeadFault : unsigned {
    malformed = 400,        // not the one way in which a request may be written
    tooLarge = 431,         // longer than `longestHead`
    unknownEncoding = 501,  // a body that is not told by its length
    unknownVersion = 505,   // not HTTP/1.1
};

// The head of an HTTP/1.1 request: its first line and its fields.
//
// Read strictly, because two readers that understand one request in two ways are how requests are
// smuggled: lines end in CR LF and in nothing else, no field goes on on the next line, a length is
// told at most once (not twice, even if equal), and bodies have a length.
struct HttpHead {
    static constexpr std::size_t longestHead = std::size_t{16} << 10U;

    std::string method;
    std::string target;                                       // begins with "/", printable ASCII
    std::vector<std::pair<std::string, std::string>> fields;  // names in lower case
    std::uint64_t contentLength = 0;
    bool hasLength = false;
    bool keepsAlive = true;

    // Where the head that the bytes begin with ends: behind its empty line. None while it has not
    // come as a whole; a fault as soon as it can't become one.
    [[nodiscard]] static std::expected<std::optional<std::size_t>, HeadFault> endOf(
        std::string_view bytes);
    // Takes a whole head apart, with its empty line.
    [[nodiscard]] static std::expected<HttpHead, HeadFault> parsed(std::string_view bytes);

    // The field's value; none where it is missing or comes more than once.
    [[nodiscard]] std::optional<std::string_view> field(std::string_view name) const;
    [[nodiscard]] std::size_t count(std::string_view name) const;
};

}  // namespace marrowdale::host
