#include "providers/marrowdale/fs/DocIDChangePath.h"

#include <algorithm>
#include <charconv>
#include <system_error>

namespace marrowdale {

namespace {

constexpr std::string_view digits = "0123456789";
constexpr std::string_view blanks = " \t\n\v\f\r";

bool skip(std::string_view& rest, std::string_view literal) {
    if (!rest.starts_with(literal)) {
        return false;
    }
    rest.remove_prefix(literal.size());
    return true;
}

// A base-10 number as the C library reads it, without its dependence on a terminating NUL. False
// only when it is out of range.
bool readNumber(std::string_view& rest, std::int64_t& number) {
    number = 0;
    std::string_view text = rest.substr(std::min(rest.find_first_not_of(blanks), rest.size()));
    const bool negative = text.starts_with('-');
    if (negative || text.starts_with('+')) {
        text.remove_prefix(1);
    }
    const auto length = std::min(text.find_first_not_of(digits), text.size());
    if (length == 0) {
        return true;  // nothing to read is 0 and takes nothing away
    }
    const char* const first = negative ? text.data() - 1 : text.data();
    const auto result = std::from_chars(first, text.data() + length, number);
    rest = text.substr(length);
    return result.ec == std::errc();
}

bool skipDevice(std::string_view& rest) {
    if (rest.empty() || !digits.contains(rest.front())) {
        return true;
    }
    std::int64_t device = 0;
    return readNumber(rest, device) && skip(rest, "/");
}

}  // namespace

bool parseDocIDChangePath(std::string_view path, DocIDChange& change) {
    std::string_view rest = path.substr(std::min(path.find_first_not_of('/'), path.size()));
    DocIDChange read;
    const bool complete = skip(rest, ".docid/") && skipDevice(rest) && skip(rest, "changed/") &&
                          readNumber(rest, read.documentID) && skip(rest, "/src=") &&
                          readNumber(rest, read.sourceFileID) && skip(rest, ",dst=") &&
                          readNumber(rest, read.destinationFileID) && rest.empty();
    if (complete) {
        change = read;
    }
    return complete;
}

}  // namespace marrowdale
