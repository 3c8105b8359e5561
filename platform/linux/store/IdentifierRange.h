#pragma once

#include <cstdint>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/store/DiskFile.h"

namespace marrowdale::native {

// The ranges of identifiers that may be in use: their upper ends are on the disk before an
// identifier is used, so that the run after a crash begins beyond everything that anybody can have
// seen. One thread.
class IdentifierRange {
  public:
    static constexpr std::uint64_t eventStep = 1U << 20U;
    static constexpr std::uint32_t documentStep = 1U << 12U;

    IdentifierRange() = default;
    [[nodiscard]] static Expected<IdentifierRange> create(const std::string& path,
                                                          const UUID& store,
                                                          std::uint64_t lastEvent,
                                                          std::uint32_t lastDocument);
    // Damage where it does not check or is another store's.
    [[nodiscard]] static Expected<IdentifierRange> open(const std::string& path, const UUID& store);

    [[nodiscard]] std::uint64_t eventEnd() const { return eventEnd_; }
    [[nodiscard]] std::uint32_t documentEnd() const { return documentEnd_; }

    // Makes both usable up to these, which costs a sync where they lie beyond the ranges.
    [[nodiscard]] Expected<void> reserve(std::uint64_t lastEvent, std::uint32_t lastDocument);
    // A clean end: exactly these are in use.
    [[nodiscard]] Expected<void> close(std::uint64_t lastEvent, std::uint32_t lastDocument);

  private:
    [[nodiscard]] Expected<void> write(std::uint64_t eventEnd, std::uint32_t documentEnd,
                                       bool clean);

    DiskFile file_;
    UUID store_;
    std::uint64_t eventEnd_ = 0;
    std::uint32_t documentEnd_ = 0;
};

}  // namespace marrowdale::native
