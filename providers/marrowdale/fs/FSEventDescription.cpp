#include "providers/marrowdale/fs/FSEventDescription.h"

#include <array>
#include <charconv>
#include <string_view>

namespace marrowdale {

namespace {

struct NamedFlag {
    std::uint32_t bit;
    std::string_view name;
};
constexpr std::array namedFlags{
    NamedFlag{FileEventFlag::userDropped, "userDropped"},
    NamedFlag{FileEventFlag::kernelDropped, "kernelDropped"},
    NamedFlag{FileEventFlag::eventIDsWrapped, "eventIDsWrapped"},
    NamedFlag{FileEventFlag::historyDone, "historyDone"},
    NamedFlag{FileEventFlag::appeared, "appeared"},
    NamedFlag{FileEventFlag::changed, "changed"},
    NamedFlag{FileEventFlag::renamed, "renamed"},
    NamedFlag{FileEventFlag::gone, "gone"},
    NamedFlag{FileEventFlag::isFolder, "isFolder"},
    NamedFlag{FileEventFlag::documentMoved, "documentMoved"},
};

std::string hexadecimal(std::uint32_t number) {
    std::array<char, 8> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number, 16).ptr;
    return "0x" + std::string(digits.data(), end);
}

}  // namespace

std::string flagNames(std::uint32_t flags) {
    std::string names;
    const auto add = [&](std::string_view name) {
        names += names.empty() ? "" : "/";
        names += name;
    };
    for (const NamedFlag& flag : namedFlags) {
        if ((flags & flag.bit) != 0) {
            add(flag.name);
            flags &= ~flag.bit;
        }
    }
    if (flags != 0) {
        add(hexadecimal(flags));
    }
    return names;
}

std::string description(const FileEvent& event) {
    return "(" + flagNames(event.flags) + ") \"" + event.path.value_or("") +
           "\" fileID:" + (event.fileID ? std::to_string(raw(*event.fileID)) : "unspecified") +
           " eventID:" + std::to_string(raw(event.id));
}

std::string description(const DocIDChange& change) {
    return "<docID:" + std::to_string(change.documentID) +
           " src:" + std::to_string(change.sourceFileID) +
           " dst:" + std::to_string(change.destinationFileID) + ">";
}

}  // namespace marrowdale
