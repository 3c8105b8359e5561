#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// The folders in which applications keep their data apart, one for each, named by its identifier.
// An application has a data container here when that folder and the "Documents" in it are real
// folders, which can be read, on the storage root's volume, and neither holds the storage root nor
// lies in it. Applications own these folders, so nothing in them is followed. Immutable; any
// thread.
class DataContainers {
  public:
    // `folder`: where the containers are; empty, or missing, for none. `storageRoot` as the store
    // serves it, without links.
    DataContainers(const std::string& folder, const std::string& storageRoot);

    // The path of the folder that holds the containers, without links; empty when there is none.
    [[nodiscard]] const std::string& folder() const { return folder_; }

    enum class Refusal : std::uint8_t {
        none,
        missing,      // there is no such folder, or something else stands there
        otherVolume,  // it lies on another volume than the storage root
        unreadable,
        overlapping,  // the storage root is in it, or it is in the storage root
    };
    struct Container {
        Refusal refusal = Refusal::missing;
        std::string path;    // of the container; only without a refusal
        FileID documents{};  // which folder its "Documents" is; the same
    };
    [[nodiscard]] Container containerOf(std::string_view identifier) const;

    // The folder of all containers as it stands now, for questions that come together.
    [[nodiscard]] Expected<UniqueFD> open() const;
    // The same as `containerOf` with a folder that was opened by this.
    [[nodiscard]] Container containerIn(const Expected<UniqueFD>& folder,
                                        std::string_view identifier) const;

    // The identifier whose container, or documents folder, the path is; none for other paths. The
    // disk is not asked.
    [[nodiscard]] std::optional<std::string> identifierAt(std::string_view path) const;

  private:
    std::string folder_;
    std::string storageRoot_;
    std::optional<DeviceID> device_;
};

}  // namespace marrowdale::native
