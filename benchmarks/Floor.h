#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace marrowdale::benchmarks {

// The least that the kernel takes for what a listing needs to know: bare calls into buffers that
// stay, one thread, nothing kept and nothing built. A call that fails throws std::system_error.

enum class FloorCalls {
    statusOnly,                // getdents64, statx
    attributesByFolderHandle,  // and listxattrat, getxattrat of those that are there (Linux 6.13)
    attributesByCurrentFolder  // and llistxattr, lgetxattr with the folder as the current one
};

struct FloorCount {
    std::uint64_t entries = 0;
    std::uint64_t attributes = 0;
    std::uint64_t checksum = 0;  // so that no reading can be left out by the compiler
};

// Everything below the folder, at all depths.
[[nodiscard]] FloorCount floorListing(const std::string& folder, FloorCalls calls);

[[nodiscard]] bool kernelHasAttributesByFolderHandle();

// What the kernel itself offers to find a file by an identifier: handles, made beforehand, opened
// and asked for their path. For root alone.
class FloorHandles {
  public:
    FloorHandles(const std::string& mountedFolder, const std::vector<std::string>& paths);
    ~FloorHandles();
    FloorHandles(const FloorHandles&) = delete;
    FloorHandles& operator=(const FloorHandles&) = delete;

    // One open_by_handle_at and one readlink for each; the bytes of all paths together.
    [[nodiscard]] std::uint64_t readAllPaths() const;

  private:
    int mount_ = -1;
    std::vector<std::vector<char>> handles_;
};

// One statx for each path.
[[nodiscard]] std::uint64_t floorStatus(const std::vector<std::string>& paths);

}  // namespace marrowdale::benchmarks
