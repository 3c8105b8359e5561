#pragma once

#include <cstdint>
#include <random>
#include <string>

namespace marrowdale::tests {

enum class HardLinks : std::uint8_t { leftOut, made };

// Does to a tree what programs and people do, at random: files, folders, renames, moves, hard
// links, safe saves, deletes of trees, hidden names, packages, exchanges, links, metadata. Names
// are few, so that they meet; what a step needs and does not find, it leaves undone. One thread.
class RandomWriter {
  public:
    // Makes a file beside the root too, for links to lead to. `hardLinks`: whether files get
    // further names that stay; a safe save uses one for a moment anyway.
    RandomWriter(std::string root, std::uint32_t seed, HardLinks hardLinks = HardLinks::made);

    void step();
    void steps(int count) {
        for (int i = 0; i < count; ++i) {
            step();
        }
    }

  private:
    [[nodiscard]] unsigned upTo(unsigned count) { return static_cast<unsigned>(random_()) % count; }
    // Of a folder or file that may be there.
    [[nodiscard]] std::string folder();
    [[nodiscard]] std::string file();
    void write(const std::string& path);
    void append(const std::string& path);
    void rename(const std::string& from, const std::string& to, unsigned flags = 0) const;
    void moveFolder();
    void save();

    const std::string root_;
    const std::string linked_;
    const HardLinks hardLinks_;
    std::mt19937 random_;
};

}  // namespace marrowdale::tests
