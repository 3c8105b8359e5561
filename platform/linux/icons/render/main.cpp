// Draws one icon: see RenderProtocol.h. Given a file that anybody may have written, it limits
// itself before it looks at the first byte.

#include <algorithm>
#include <cairo.h>
#include <charconv>
#include <csignal>
#include <cstdint>
#include <librsvg/rsvg.h>
#include <memory>
#include <optional>
#include <span>
#include <string_view>
#include <sys/resource.h>
#include <unistd.h>

#include "platform/linux/icons/CachedBitmap.h"
#include "platform/linux/icons/IconRenderer.h"
#include "platform/linux/icons/PNG.h"
#include "platform/linux/icons/RenderProtocol.h"

namespace {

using namespace marrowdale;          // NOLINT(google-build-using-namespace): a program's own file
using namespace marrowdale::native;  // NOLINT(google-build-using-namespace)

constexpr rlim_t memoryBytes = rlim_t{1} << 30U;
constexpr rlim_t processorSeconds = 5;
constexpr std::uint32_t largestPicture = 4096;

struct Free {
    void operator()(cairo_surface_t* surface) const { ::cairo_surface_destroy(surface); }
    void operator()(cairo_t* context) const { ::cairo_destroy(context); }
    void operator()(RsvgHandle* handle) const { ::g_object_unref(handle); }
};
using Surface = std::unique_ptr<cairo_surface_t, Free>;
using Context = std::unique_ptr<cairo_t, Free>;
using Vector = std::unique_ptr<RsvgHandle, Free>;

void limitThisProcess() {
    const auto limit = [](auto resource, rlim_t value) {
        const rlimit both{value, value};
        (void)::setrlimit(resource, &both);
    };
    if constexpr (MARROWDALE_IS_SANITIZED == 0) {  // sanitizers reserve far more
        limit(RLIMIT_AS, memoryBytes);
    }
    limit(RLIMIT_CPU, processorSeconds);
    limit(RLIMIT_FSIZE, 0);
    limit(RLIMIT_CORE, 0);
}

Bytes standardInput() {
    Bytes bytes(IconRenderer::largestFile);
    std::size_t filled = 0;
    ssize_t got = 1;
    while (filled < bytes.size() && got > 0) {
        got = ::read(STDIN_FILENO, bytes.data() + filled, bytes.size() - filled);
        filled += got > 0 ? static_cast<std::size_t>(got) : 0;
    }
    bytes.resize(filled);
    return bytes;
}

Surface newSurface(std::uint32_t width, std::uint32_t height) {
    return Surface(::cairo_image_surface_create(CAIRO_FORMAT_ARGB32, static_cast<int>(width),
                                                static_cast<int>(height)));
}

std::span<std::uint8_t> rowOf(cairo_surface_t* surface, std::uint32_t row) {
    const auto stride = static_cast<std::size_t>(::cairo_image_surface_get_stride(surface));
    return {::cairo_image_surface_get_data(surface) + row * stride, stride};
}

// The surface's pixels are multiplied by alpha and lie in the order blue, green, red, alpha.
Surface surfaceWithImage(const Image& image) {
    Surface surface = newSurface(image.width, image.height);
    const auto pixels = image.pixels.bytes();
    for (std::uint32_t y = 0; y < image.height; ++y) {
        const auto row = rowOf(surface.get(), y);
        for (std::size_t x = 0; x < image.width; ++x) {
            const auto from = pixels.subspan((std::size_t{y} * image.width + x) * 4, 4);
            const unsigned alpha = from[3];
            for (std::size_t channel = 0; channel < 3; ++channel) {
                row[4 * x + channel] =
                    static_cast<std::uint8_t>((from[2 - channel] * alpha + 127) / 255);
            }
            row[4 * x + 3] = static_cast<std::uint8_t>(alpha);
        }
    }
    ::cairo_surface_mark_dirty(surface.get());
    return surface;
}

Image imageWithSurface(cairo_surface_t* surface, std::uint32_t side) {
    ::cairo_surface_flush(surface);
    Bytes pixels(std::size_t{4} * side * side);
    for (std::uint32_t y = 0; y < side; ++y) {
        const auto row = rowOf(surface, y);
        for (std::size_t x = 0; x < side; ++x) {
            const unsigned alpha = row[4 * x + 3];
            auto* const to = pixels.data() + (std::size_t{y} * side + x) * 4;
            for (std::size_t channel = 0; channel < 3; ++channel) {
                const unsigned value = row[4 * x + 2 - channel];
                to[channel] = alpha == 0 ? std::uint8_t{0}
                                         : static_cast<std::uint8_t>(
                                               std::min(255U, (value * 255 + alpha / 2) / alpha));
            }
            to[3] = static_cast<std::uint8_t>(alpha);
        }
    }
    return {.width = side, .height = side, .pixels = Data(std::move(pixels))};
}

bool drawVector(std::span<const std::uint8_t> bytes, cairo_t* context, double side) {
    const Vector handle(::rsvg_handle_new_from_data(bytes.data(), bytes.size(), nullptr));
    if (!handle) {
        return false;
    }
    // The picture keeps its proportions, in the middle.
    const RsvgRectangle viewport{0, 0, side, side};
    return ::rsvg_handle_render_document(handle.get(), context, &viewport, nullptr) != FALSE &&
           ::cairo_status(context) == CAIRO_STATUS_SUCCESS;
}

bool drawPixels(const Image& image, cairo_t* context, double side) {
    const Surface picture = surfaceWithImage(image);
    const double scale = side / std::max(image.width, image.height);
    ::cairo_translate(context, (side - image.width * scale) / 2, (side - image.height * scale) / 2);
    ::cairo_scale(context, scale, scale);
    ::cairo_set_source_surface(context, picture.get(), 0, 0);
    ::cairo_pattern_set_filter(::cairo_get_source(context), CAIRO_FILTER_BEST);
    ::cairo_paint(context);
    return ::cairo_status(context) == CAIRO_STATUS_SUCCESS;
}

bool isPNG(std::span<const std::uint8_t> bytes) {
    return bytes.size() > 8 && bytes[0] == 0x89 && bytes[1] == 'P' && bytes[2] == 'N' &&
           bytes[3] == 'G';
}

bool writeAll(std::span<const std::uint8_t> bytes) {
    while (!bytes.empty()) {
        const ssize_t written = ::write(STDOUT_FILENO, bytes.data(), bytes.size());
        if (written <= 0) {
            return false;
        }
        bytes = bytes.subspan(static_cast<std::size_t>(written));
    }
    return true;
}

int draw(std::uint32_t side, bool mayEnlarge) {
    const Bytes bytes = standardInput();
    const Surface surface = newSurface(side, side);
    const Context context(::cairo_create(surface.get()));
    bool isDrawn = false;
    if (isPNG(bytes)) {
        const auto image = imageWithPNG(bytes, largestPicture);
        if (image && !mayEnlarge && std::max(image->width, image->height) < side) {
            return renderTooSmall;
        }
        isDrawn = image && drawPixels(*image, context.get(), side);
    } else {
        isDrawn = drawVector(bytes, context.get(), side);
    }
    const auto bitmap = isDrawn ? cachedBitmapWithImage(imageWithSurface(surface.get(), side))
                                : Unexpected(errorWithPOSIXCode(0));
    return bitmap && writeAll(bitmap->bytes()) ? 0 : renderNoPicture;
}

}  // namespace

int main(int argumentCount, char** argumentValues) {
    const std::span arguments(argumentValues, static_cast<std::size_t>(argumentCount));
    const std::string_view size = arguments.size() == 3 ? arguments[1] : "";
    const std::string_view mode = arguments.size() == 3 ? arguments[2] : "";
    std::uint32_t side = 0;
    const auto read = std::from_chars(size.data(), size.data() + size.size(), side);
    if (read.ec != std::errc() || side == 0 || side > largestBitmapSide ||
        (mode != renderEnlarging && mode != renderExact)) {
        return renderWrongUse;
    }
    limitThisProcess();
    return draw(side, mode == renderEnlarging);
}
