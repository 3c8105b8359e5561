#include "platform/linux/files/MimeGlobs.h"

#include <algorithm>
#include <fnmatch.h>
#include <ranges>
#include <tuple>
#include <utility>

namespace marrowdale::native {

namespace {

constexpr std::size_t longestName = 255;

constexpr unsigned char folded(unsigned char c) {
    return c >= 'A' && c <= 'Z' ? static_cast<unsigned char>(c - 'A' + 'a') : c;
}

constexpr unsigned char byteOf(char c) {
    return static_cast<unsigned char>(c);
}

std::string foldedText(std::string_view text) {
    std::string result(text);
    std::ranges::transform(result, result.begin(),
                           [](char c) { return static_cast<char>(folded(byteOf(c))); });
    return result;
}

bool hasWildcard(std::string_view text) {
    return text.find_first_of("*?[\\") != std::string_view::npos;
}

std::string_view firstElement(std::string_view pattern) {
    const std::size_t end = pattern.front() == '[' ? pattern.find(']', 2) : 0;
    return pattern.substr(0, end == std::string_view::npos ? pattern.size() : end + 1);
}

std::string_view lastElement(std::string_view pattern) {
    const std::size_t start = pattern.back() == ']' ? pattern.rfind('[') : pattern.size() - 1;
    return pattern.substr(start == std::string_view::npos ? pattern.size() - 1 : start);
}

// The bytes that one element of a pattern (a letter, a set, a star) can stand for.
std::bitset<256> bytesOf(std::string_view element, bool caseSensitive) {
    const std::string pattern(element);
    std::bitset<256> bytes;
    for (unsigned value = 1; value < bytes.size(); ++value) {
        const auto byte = static_cast<unsigned char>(value);
        const std::array<char, 2> text{static_cast<char>(caseSensitive ? byte : folded(byte)), 0};
        // A byte that is no letter of the locale is left to the whole pattern's match.
        bytes[value] = value >= 0x80U || ::fnmatch(pattern.c_str(), text.data(), 0) == 0;
    }
    return bytes;
}

// A name as a C string, as it is and folded, without an allocation.
struct NameText {
    // Made for each name that is looked up, and written as far as it is read.
    // NOLINTNEXTLINE(cppcoreguidelines-pro-type-member-init)
    explicit NameText(std::string_view name) {
        const std::size_t size = std::min(name.size(), longestName);
        for (std::size_t i = 0; i < size; ++i) {
            asIs[i] = name[i];
            lower[i] = static_cast<char>(folded(byteOf(name[i])));
        }
        asIs[size] = '\0';
        lower[size] = '\0';
    }
    std::array<char, longestName + 1> asIs;
    std::array<char, longestName + 1> lower;
};

}  // namespace

void MimeGlobs::add(std::string_view glob, std::string_view type, int weight, Case caseRule) {
    if (glob.empty()) {
        return;
    }
    const bool sensitive = caseRule == Case::sensitive;
    const bool suffix = glob.front() == '*' && glob.size() > 1 && !hasWildcard(glob.substr(1));
    if (suffix || !hasWildcard(glob)) {
        const std::string_view text = suffix ? glob.substr(1) : glob;
        globs_.push_back(
            {sensitive ? std::string(text) : foldedText(text), type, weight, !suffix, sensitive});
        return;
    }
    const std::string text = sensitive ? std::string(glob) : foldedText(glob);
    Pattern pattern{{text, type, weight, false, sensitive},
                    bytesOf(firstElement(text), sensitive),
                    bytesOf(lastElement(text), sensitive)};
    // The heaviest first, then the longest, then the one added first.
    const auto place = std::ranges::find_if(patterns_, [&pattern](const Pattern& other) {
        return std::pair(other.glob.weight, other.glob.text.size()) <
               std::pair(pattern.glob.weight, pattern.glob.text.size());
    });
    patterns_.insert(place, std::move(pattern));
}

void MimeGlobs::freeze() {
    struct Building {
        std::vector<std::pair<unsigned char, std::uint32_t>> children;
        std::vector<std::uint32_t> globs;
    };
    std::vector<Building> tree(1);
    for (std::uint32_t index = 0; index < globs_.size(); ++index) {
        std::uint32_t at = 0;
        for (const char c : std::views::reverse(globs_[index].text)) {
            const unsigned char byte = folded(byteOf(c));
            const auto& children = tree[at].children;
            const auto known =
                std::ranges::find(children, byte, &std::pair<unsigned char, std::uint32_t>::first);
            if (known != children.end()) {
                at = known->second;
                continue;
            }
            const auto made = static_cast<std::uint32_t>(tree.size());
            tree[at].children.emplace_back(byte, made);
            tree.emplace_back();
            at = made;
        }
        tree[at].globs.push_back(index);
    }
    std::vector<Glob> ordered;
    ordered.reserve(globs_.size());
    for (Building& building : tree) {
        std::ranges::sort(building.children);
        // Best first, so that the first that matches is the answer.
        std::ranges::sort(building.globs, [this](std::uint32_t a, std::uint32_t b) {
            const Glob& left = globs_[a];
            const Glob& right = globs_[b];
            return std::tuple(left.literal, left.weight, b) >
                   std::tuple(right.literal, right.weight, a);
        });
        nodes_.push_back({static_cast<std::uint32_t>(edges_.size()),
                          static_cast<std::uint32_t>(building.children.size()),
                          static_cast<std::uint32_t>(ordered.size()),
                          static_cast<std::uint32_t>(building.globs.size())});
        for (const auto& [byte, node] : building.children) {
            edges_.push_back({byte, node});
        }
        for (const std::uint32_t index : building.globs) {
            ordered.push_back(std::move(globs_[index]));
        }
    }
    globs_ = std::move(ordered);
}

std::string_view MimeGlobs::find(std::string_view name) const {
    if (name.empty() || nodes_.empty()) {
        return {};
    }
    const Glob* found = findPattern(name, findSuffix(name));
    return found != nullptr ? found->type : std::string_view();
}

const MimeGlobs::Node* MimeGlobs::child(const Node& node, unsigned char byte) const {
    const Edge* begin = edges_.data() + node.firstEdge;
    const Edge* end = begin + node.edgeCount;
    const Edge* edge = std::lower_bound(
        begin, end, byte, [](const Edge& e, unsigned char wanted) { return e.byte < wanted; });
    return edge != end && edge->byte == byte ? &nodes_[edge->node] : nullptr;
}

const MimeGlobs::Glob* MimeGlobs::findSuffix(std::string_view name) const {
    const Glob* best = nullptr;
    const Node* node = nodes_.data();
    for (std::size_t start = name.size(); start > 0; --start) {
        node = child(*node, folded(byteOf(name[start - 1])));
        if (node == nullptr) {
            break;
        }
        for (std::uint32_t i = 0; i < node->globCount; ++i) {
            const Glob& glob = globs_[node->firstGlob + i];
            if ((!glob.literal || start == 1) &&
                (!glob.caseSensitive || name.substr(start - 1) == glob.text)) {
                best = &glob;
                break;
            }
        }
    }
    return best;
}

const MimeGlobs::Glob* MimeGlobs::findPattern(std::string_view name, const Glob* found) const {
    if (found != nullptr && found->literal) {
        return found;
    }
    for (const Pattern& pattern : patterns_) {
        if (found != nullptr && pattern.glob.weight <= found->weight) {
            break;
        }
        if (!pattern.firstBytes[byteOf(name.front())] || !pattern.lastBytes[byteOf(name.back())]) {
            continue;
        }
        const NameText text(name);
        const char* subject = pattern.glob.caseSensitive ? text.asIs.data() : text.lower.data();
        if (::fnmatch(pattern.glob.text.c_str(), subject, 0) == 0) {
            return &pattern.glob;
        }
    }
    return found;
}

}  // namespace marrowdale::native
