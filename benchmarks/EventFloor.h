#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <unordered_map>
#include <unordered_set>
#include <vector>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::benchmarks {

// The least that the kernel takes to know what happens: bare calls of fanotify, one thread. A call
// that fails throws std::system_error.
class EventFloor {
  public:
    // A group with the queue's default length that listens to the folder and, at all depths, to
    // those below it.
    explicit EventFloor(const std::string& folder);

    [[nodiscard]] int descriptor() const { return group_.get(); }

    struct Drained {
        std::uint64_t events = 0;
        std::uint64_t overflows = 0;
    };
    // Reads all that is queued and counts it.
    Drained drain();
    // Reads all that is queued, looks once at each name, and appends a checked line for each to the
    // log, synced at the end. The log is a file without a name in the root folder's parent.
    Drained record();

  private:
    void listen(const std::string& path, const std::string& below);
    template <typename Take>
    Drained readAll(const Take& take);
    void note(const std::string& name);

    std::string root_;
    native::UniqueFD group_;
    native::UniqueFD rootFolder_;
    native::UniqueFD log_;
    std::unordered_map<std::string, std::string> folders_;  // path below the root, by handle
    std::unordered_set<std::string> names_;                 // of one batch
    std::vector<std::byte> pending_;
    std::vector<std::byte> buffer_;
};

}  // namespace marrowdale::benchmarks
