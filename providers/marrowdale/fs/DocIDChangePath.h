#pragma once

#include <cstdint>
#include <string_view>

namespace marrowdale {

// What the path of a document-identifier event says: the document came from one file and rests on
// another now.
struct DocIDChange {
    std::int64_t documentID = 0;
    std::int64_t sourceFileID = 0;
    std::int64_t destinationFileID = 0;
    friend bool operator==(const DocIDChange&, const DocIDChange&) = default;
};

// Reads "/.docid/DEVICE/changed/DOCUMENT/src=SOURCE,dst=DESTINATION"; any number of slashes in
// front, the device may be absent. False, and `change` as it was, for anything else, numbers out of
// a signed 64-bit range included. A number is what the C library's base-10 reader takes: blanks and
// a sign in front are allowed, and where no digit follows it is 0.
[[nodiscard]] bool parseDocIDChangePath(std::string_view path, DocIDChange& change);

}  // namespace marrowdale
