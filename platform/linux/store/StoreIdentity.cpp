#include "platform/linux/store/StoreIdentity.h"

#include <algorithm>
#include <array>
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <linux/btrfs.h>
#include <linux/ioctl.h>
#include <random>
#include <span>
#include <sys/ioctl.h>

#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/Envelope.h"
#include "platform/linux/store/Row.h"
#include "platform/linux/store/StoreDamage.h"

namespace marrowdale::native {

namespace {

constexpr Magic magic{'M', 'W', 'i', 'd', 'e', 'n', 't', 'y'};

// The kernel's answer about a file system's UUID (Linux 6.9), which older headers lack.
struct FileSystemUUID {
    std::uint8_t length;
    std::array<std::uint8_t, 16> bytes;
};

UUID fileSystemUUID(int folder) {
    FileSystemUUID answer{};
    constexpr auto request = _IOR(0x15, 0, FileSystemUUID);
    if (::ioctl(folder, request, &answer) == 0 && answer.length == answer.bytes.size()) {
        return UUID{answer.bytes};
    }
    // btrfs answers by a call of its own only.
    UUID uuid;
    btrfs_ioctl_fs_info_args information{};
    if (::ioctl(folder, BTRFS_IOC_FS_INFO, &information) == 0) {
        std::ranges::copy(information.fsid, uuid.bytes.begin());
    }
    return uuid;
}

// FNV-1a. Nobody who may write here gains anything by a collision, and one is noticed: the
// identity in the store says what the store is bound to.
std::uint64_t hashOf(std::span<const std::byte> bytes) {
    std::uint64_t hash = 0xcbf29ce484222325U;
    for (const std::byte byte : bytes) {
        hash = (hash ^ static_cast<std::uint8_t>(byte)) * 0x100000001b3U;
    }
    return hash;
}

template <typename T>
bool bothTellAndDiffer(const T& a, const T& b) {
    return a != T{} && b != T{} && a != b;
}

}  // namespace

Expected<RootBinding> RootBinding::of(int folder, const std::string& path) {
    const auto status = statEntry(folder, "");
    if (!status) {
        return Unexpected(errorWithPOSIXCode(status.error().code, "look at", path));
    }
    const auto fingerprint = handleFingerprint(folder, "");
    RootBinding binding;
    binding.path = path;
    binding.fileID = raw(status->fileID);
    binding.birth = rowBirth(*status);
    binding.fingerprint = fingerprint ? *fingerprint : 0;
    binding.fileSystem = fileSystemUUID(folder);
    return binding;
}

std::string RootBinding::key() const {
    ByteWriter what;
    what.put(fileSystem.bytes);
    what.put(fileID);
    what.put(birth);
    what.put(fingerprint);
    // Roots of such file systems all have the same inode number.
    if (birth == 0 && fileSystem == UUID()) {
        what.textWithLength(path);
    }
    std::array<char, keySize + 1> digits{};
    (void)std::snprintf(digits.data(), digits.size(), "%016" PRIx64, hashOf(what.bytes()));
    return digits.data();
}

bool RootBinding::isSameFolderAs(const RootBinding& other) const {
    if (fileID != other.fileID || bothTellAndDiffer(birth, other.birth) ||
        bothTellAndDiffer(fingerprint, other.fingerprint) ||
        bothTellAndDiffer(fileSystem, other.fileSystem)) {
        return false;
    }
    const bool bothTellBirth = birth != 0 && other.birth != 0;
    const bool bothTellFileSystem = fileSystem != UUID() && other.fileSystem != UUID();
    return bothTellBirth || bothTellFileSystem || path == other.path;
}

StoreIdentity StoreIdentity::fresh(const RootBinding& root, const std::string& stateFolder,
                                   const std::string& reason) {
    std::random_device random;
    // The lower half, so that there are always 2^31 left.
    std::uniform_int_distribution<std::uint32_t> place(1, 0x7FFFFFFFU);
    StoreIdentity identity;
    identity.uuid = UUID::random();
    identity.created = rowTime(Date::now());
    identity.root = root;
    identity.firstDocument = place(random);
    identity.stateFolder = stateFolder;
    identity.reason = reason;
    return identity;
}

Expected<void> StoreIdentity::write(const std::string& path) const {
    ByteWriter body;
    body.put(created);
    body.put(root.fileID);
    body.put(root.birth);
    body.put(root.fingerprint);
    body.put(root.fileSystem.bytes);
    body.put(firstDocument);
    body.textWithLength(root.path);
    body.textWithLength(stateFolder);
    body.textWithLength(reason);
    const auto file = DiskFile::open(path, O_RDWR | O_CREAT | O_TRUNC);
    if (!file) {
        return Unexpected(file.error());
    }
    if (auto written = file->write(encodeEnvelope(magic, uuid, body.bytes()), 0); !written) {
        return written;
    }
    return file->sync();
}

Expected<StoreIdentity> StoreIdentity::read(const std::string& path) {
    const auto file = DiskFile::open(path, O_RDONLY);
    if (!file) {
        return Unexpected(missingIsDamage(file.error(), path));
    }
    const auto envelope = readEnvelope(*file, magic);
    if (!envelope) {
        return Unexpected(envelope.error());
    }
    ByteReader body(envelope->body);
    StoreIdentity identity;
    identity.uuid = envelope->store;
    identity.created = body.take<std::int64_t>();
    identity.root.fileID = body.take<std::uint64_t>();
    identity.root.birth = body.take<std::int64_t>();
    identity.root.fingerprint = body.take<std::uint32_t>();
    identity.root.fileSystem.bytes = body.take<decltype(UUID::bytes)>();
    identity.firstDocument = body.take<std::uint32_t>();
    identity.root.path = body.takeTextWithLength();
    identity.stateFolder = body.takeTextWithLength();
    identity.reason = body.takeTextWithLength();
    if (!body.finished()) {
        return Unexpected(damageOf(path, "of a wrong shape"));
    }
    return identity;
}

}  // namespace marrowdale::native
