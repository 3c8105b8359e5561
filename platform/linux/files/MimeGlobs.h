#pragma once

#include <array>
#include <bitset>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace marrowdale::native {

// Finds the type that a file's name tells by shared-mime-info's globs. Filled with `add`, then
// `freeze`d; after that it is immutable, and `find` takes no lock and allocates nothing for names
// that a file can have.
//
// Which glob wins: a literal name, then the longest suffix, then the greater weight, then the one
// added first. A pattern of another form wins only where nothing else matches or its weight is
// greater. Letters are ASCII-folded unless the glob is marked case-sensitive.
class MimeGlobs {
  public:
    enum class Case : bool { insensitive, sensitive };

    // `type` must outlive the object.
    void add(std::string_view glob, std::string_view type, int weight, Case caseRule);
    void freeze();

    // Empty when no glob matches.
    [[nodiscard]] std::string_view find(std::string_view name) const;

  private:
    struct Glob {
        std::string text;  // without the star, where it is a suffix
        std::string_view type;
        int weight = 0;
        bool literal = false;
        bool caseSensitive = false;
    };
    struct Pattern {
        Glob glob;
        std::bitset<256> firstBytes;  // what a matching name can begin and end with
        std::bitset<256> lastBytes;
    };
    // The suffixes and literal names, in a tree that is walked from a name's end.
    struct Node {
        std::uint32_t firstEdge = 0;
        std::uint32_t edgeCount = 0;
        std::uint32_t firstGlob = 0;
        std::uint32_t globCount = 0;
    };
    struct Edge {
        unsigned char byte = 0;
        std::uint32_t node = 0;
    };

    [[nodiscard]] const Node* child(const Node& node, unsigned char byte) const;
    [[nodiscard]] const Glob* findSuffix(std::string_view name) const;
    [[nodiscard]] const Glob* findPattern(std::string_view name, const Glob* found) const;

    std::vector<Glob> globs_;  // sorted by reversed, folded text once frozen
    std::vector<Pattern> patterns_;
    std::vector<Node> nodes_;
    std::vector<Edge> edges_;
};

}  // namespace marrowdale::native
