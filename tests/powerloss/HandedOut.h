#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/foundation/UUID.h"
#include "tests/powerloss/TreeState.h"

namespace marrowdale::tests {

// All that a store handed out, each with the position in the disk's log at which it was surely
// there: a power cut at that position or later may take nothing of it back.
struct HandedOut {
    struct Made {
        std::size_t position = 0;
        UUID store;
    };
    struct Given {
        std::size_t position = 0;
        DocumentID document{};
        FileKey file;
        std::string path;  // below the root
    };
    // A barrier's answer, and the tree that it stands for.
    struct Anchor {
        std::size_t position = 0;
        EventID event{};
        Tree tree;
    };
    struct Told {
        std::size_t position = 0;
        EventID event{};
        std::string text;
    };
    // A file was deleted or replaced; the position before that was begun.
    struct Left {
        std::size_t position = 0;
        FileKey file;
    };

    // The store was closed and opened again.
    struct Restart {
        std::size_t begin = 0;
        std::size_t end = 0;
    };

    std::optional<Made> made;
    std::vector<Given> given;
    std::vector<Anchor> anchors;
    std::vector<Told> told;
    std::vector<Left> left;
    std::vector<Restart> restarts;
};

}  // namespace marrowdale::tests
