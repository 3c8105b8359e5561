#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>

#include "platform/linux/store/Envelope.h"

namespace marrowdale::native {

// The layout of a segment (docs/formats/store.md).
inline constexpr Magic segmentMagic{'M', 'W', 's', 'e', 'g', 'm', 'n', 't'};
inline constexpr std::size_t segmentHeaderSize = 64;
using FrameMagic = std::array<char, 4>;
inline constexpr FrameMagic frameMagic{'M', 'W', 'f', 'r'};
inline constexpr std::size_t frameHeaderSize = 48;
// Records of one frame end soon after this many bytes.
inline constexpr std::size_t frameSize = 1U << 20U;
// No frame is longer than this.
inline constexpr std::size_t largestFrame = frameSize + (1U << 24U);

struct FrameHeader {
    static constexpr std::uint32_t commitGoesOn = 1;

    std::uint64_t sequence = 0;
    std::uint64_t firstEvent = 0;
    std::uint64_t lastEvent = 0;
    std::uint32_t recordCount = 0;
    std::uint32_t flags = 0;
};

struct SegmentHeader {
    std::uint64_t number = 0;
    std::uint64_t firstSequence = 0;
    std::uint64_t lastEventBefore = 0;
    std::uint32_t created = 0;  // seconds since 1970, as the clock stood
};

}  // namespace marrowdale::native
