#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/store/DiskFile.h"

namespace marrowdale::native {

// The root folder as a store is bound to it: what it is, and where it stands. What the file system
// does not tell is 0.
struct RootBinding {
    static constexpr std::size_t keySize = 16;

    std::string path;
    std::uint64_t fileID = 0;
    std::int64_t birth = 0;
    std::uint32_t fingerprint = 0;
    UUID fileSystem;

    // Looks at the open root folder.
    [[nodiscard]] static Expected<RootBinding> of(int folder, const std::string& path);
    // A name for the folder, `keySize` hexadecimal digits made of what it is. The path counts only
    // where the rest says too little.
    [[nodiscard]] std::string key() const;
    // What either does not tell is not compared. The path does not count, but where the rest says
    // too little.
    [[nodiscard]] bool isSameFolderAs(const RootBinding& other) const;

    friend bool operator==(const RootBinding&, const RootBinding&) = default;
};

// What a store is, written when it is made, and again when its root folder was moved.
struct StoreIdentity {
    UUID uuid;
    std::int64_t created = 0;  // nanoseconds since 1970
    RootBinding root;
    std::uint32_t firstDocument = 0;
    std::string stateFolder;
    std::string reason;  // why it was made in place of an earlier one

    // Of the format that this program writes, at a random place of the document identifiers.
    [[nodiscard]] static StoreIdentity fresh(const RootBinding& root,
                                             const std::string& stateFolder,
                                             const std::string& reason);
    [[nodiscard]] Expected<void> write(const std::string& path) const;
    [[nodiscard]] static Expected<StoreIdentity> read(const std::string& path);
};

}  // namespace marrowdale::native
