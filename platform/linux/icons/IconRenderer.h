#pragma once

#include <chrono>
#include <cstdint>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/services/Image.h"

namespace marrowdale::native {

// Draws icons from files. Pictures come from anywhere, and so do the faults of the libraries that
// read them, so each is drawn by a process of its own, which is given the open file and nothing
// else, limits on its time and memory, and a deadline. Any thread.
class IconRenderer {
  public:
    static constexpr std::size_t largestFile = std::size_t{16} << 20U;

    // `program`: the path of the program that draws.
    explicit IconRenderer(std::string program,
                          std::chrono::milliseconds deadline = std::chrono::seconds(10));

    // Whether a picture made of pixels may be made larger than it is.
    enum class Enlarging : std::uint8_t { no, yes };
    // The picture as a square of that many pixels, in the cached-bitmap form, which is whole.
    // Errors: those of opening the file; EINVAL for what is no regular file or no picture; EFBIG
    // for a file that is too large; ERANGE for a picture that would have to be enlarged; ETIMEDOUT
    // past the deadline; ENOENT also where the program is missing.
    [[nodiscard]] Expected<Data> render(const std::string& path, unsigned pixels,
                                        Enlarging enlarging) const;

  private:
    const std::string program_;
    const std::chrono::milliseconds deadline_;
};

}  // namespace marrowdale::native
