#pragma once

#include "platform/linux/files/AttributeCalls.h"
#include "platform/linux/files/ServedTrees.h"
#include "platform/services/ExtendedAttributes.h"

namespace marrowdale::native {

// Extended attributes in Linux's namespace for users. The largest value is the file system's
// matter: E2BIG beyond 64 KiB, ENOSPC where it has less room. A name with a NUL byte is EINVAL.
class LinuxExtendedAttributes final : public ExtendedAttributes {
  public:
    // Both must outlive this object.
    LinuxExtendedAttributes(AttributeCalls& calls, const ServedTrees& trees)
        : calls_(calls), trees_(trees) {}

    [[nodiscard]] Expected<std::size_t> size(const URL& url, std::string_view name) override;
    [[nodiscard]] Expected<Data> read(const URL& url, std::string_view name,
                                      std::size_t room) override;
    [[nodiscard]] Expected<void> set(const OpenFile& file, std::string_view name,
                                     const Data& value) override;
    [[nodiscard]] Expected<void> remove(const OpenFile& file, std::string_view name) override;

  private:
    // Reads into `buffer`; an empty one asks for the size.
    [[nodiscard]] Expected<std::size_t> get(const URL& url, std::string_view name,
                                            std::span<std::uint8_t> buffer);

    AttributeCalls& calls_;
    const ServedTrees& trees_;
};

}  // namespace marrowdale::native
