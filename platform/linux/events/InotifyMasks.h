#pragma once

#include <cstdint>

namespace marrowdale::native {

// What is asked of inotify, and what its answers mean.
struct InotifyMasks {
    // Of a folder, about itself and what is in it.
    static const std::uint32_t folder;
    // Of the root of a tree besides: its own end and its own moves.
    static const std::uint32_t rootToo;
    // Of a file that is watched itself.
    static const std::uint32_t file;

    // The bits of WatchHint::what for an event with that mask; bits that are not known mean
    // nothing.
    [[nodiscard]] static std::uint32_t what(std::uint32_t mask);
};

}  // namespace marrowdale::native
