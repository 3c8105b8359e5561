#pragma once

#include <cstdint>

namespace marrowdale::native {

// What is asked of fanotify, and what its answers mean.
struct FanotifyMasks {
    // Of a folder, about itself and what is in it.
    static const std::uint64_t folder;
    // Of the root of a tree besides: its own end and its own moves. (Elsewhere the folder above
    // tells these.)
    static const std::uint64_t rootToo;
    // Of a file that is marked itself.
    static const std::uint64_t file;

    // The bits of WatchHint::what for an event with that mask; bits that are not known mean
    // nothing. Of a rename there are two places, each with its own bit (movedFrom, movedTo), which
    // the mask alone does not tell apart: it gives neither.
    [[nodiscard]] static std::uint32_t what(std::uint64_t mask);
};

}  // namespace marrowdale::native
