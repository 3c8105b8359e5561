#include "platform/linux/icons/BuiltInIcon.h"

#include <algorithm>
#include <array>
#include <cmath>

namespace marrowdale::native {

namespace {

using Colour = std::array<double, 3>;

constexpr Colour top{0.53, 0.60, 0.68};
constexpr Colour bottom{0.36, 0.43, 0.52};
constexpr Colour mark{0.93, 0.95, 0.97};
constexpr double margin = 0.08;  // all lengths as parts of the side
constexpr double corner = 0.18;
constexpr double ringRadius = 0.20;
constexpr double ringWidth = 0.045;

// How far a point lies outside of the tile's rounded outline; negative inside.
double distanceToTile(double x, double y) {
    const double half = 0.5 - margin - corner;
    const double dx = std::max(std::abs(x - 0.5) - half, 0.0);
    const double dy = std::max(std::abs(y - 0.5) - half, 0.0);
    return std::hypot(dx, dy) - corner;
}

double distanceToRing(double x, double y) {
    return std::abs(std::hypot(x - 0.5, y - 0.5) - ringRadius) - ringWidth;
}

// 1 inside, 0 outside, between them over one pixel.
double coverage(double distance, double pixel) {
    return std::clamp(0.5 - distance / pixel, 0.0, 1.0);
}

std::uint8_t byte(double part) {
    return static_cast<std::uint8_t>(std::lround(std::clamp(part, 0.0, 1.0) * 255));
}

}  // namespace

Image builtInIcon(unsigned pixels) {
    const double pixel = 1.0 / pixels;
    Bytes bytes;
    bytes.reserve(std::size_t{4} * pixels * pixels);
    for (unsigned row = 0; row < pixels; ++row) {
        for (unsigned column = 0; column < pixels; ++column) {
            const double x = (column + 0.5) * pixel;
            const double y = (row + 0.5) * pixel;
            const double ring = coverage(distanceToRing(x, y), pixel);
            for (std::size_t channel = 0; channel < 3; ++channel) {
                const double tile = std::lerp(top.at(channel), bottom.at(channel), y);
                bytes.push_back(byte(std::lerp(tile, mark.at(channel), ring)));
            }
            bytes.push_back(byte(coverage(distanceToTile(x, y), pixel)));
        }
    }
    return {.width = pixels, .height = pixels, .pixels = Data(std::move(bytes))};
}

}  // namespace marrowdale::native
