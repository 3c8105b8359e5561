#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>

#include "platform/foundation/Mutex.h"
#include "platform/linux/events/FanotifyCalls.h"
#include "platform/linux/events/FanotifyRecords.h"
#include "platform/linux/events/KernelQueue.h"
#include "platform/linux/events/WatchTable.h"
#include "platform/linux/events/Watcher.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// Listens through inode marks of fanotify, which any user may set on what he may read. The kernel
// tells folders by their handles, and a rename as one event with both places and the handle of what
// was moved. All that is watched lies on one file system.
//
// To clear a mark the kernel wants the marked folder open, so `unwatch` only stops listening: the
// mark of a folder that left the trees stays with the kernel until that folder or the watcher is
// gone. A mark goes with its folder, by itself.
class FanotifyWatcher final : public Watcher {
  public:
    // How many events the kernel keeps. Only a privileged user gets `unlimited` (135 bytes an
    // event, in kernel memory, and then there is no overflow).
    enum class Queue : std::uint8_t { bounded, unlimited };

    // `reason`: for Status. Errors: what fanotify_init says (the operation's name).
    [[nodiscard]] static Expected<std::unique_ptr<FanotifyWatcher>> create(
        std::string reason, Queue queue = Queue::bounded,
        std::shared_ptr<FanotifyCalls> calls = std::make_shared<FanotifyCalls>());

    // Sets a mark on the open folder and clears it. Errors: the operation is the call that failed.
    [[nodiscard]] Expected<void> tryFolder(int folder);

    [[nodiscard]] Expected<void> watchFolder(int folder, FileID number) override;
    [[nodiscard]] Expected<void> watchRoot(int folder, FileID number) override;
    [[nodiscard]] Expected<void> watchFile(int file, FileID number) override;
    void unwatch(FileID number) override;
    [[nodiscard]] Expected<Drained> drain(
        const std::function<void(const WatchHint&)>& sink) override;
    [[nodiscard]] int descriptor() const override { return group_.get(); }
    [[nodiscard]] Status status() const override;

  private:
    using Sink = std::function<void(const WatchHint&)>;

    // What is watched of what a record names.
    struct Resolved {
        std::optional<Watched> place;
        std::optional<Watched> from;
        std::optional<Watched> to;
        std::optional<Watched> thing;
    };

    FanotifyWatcher(UniqueFD group, std::string reason, std::uint64_t queueLimit,
                    std::shared_ptr<FanotifyCalls> calls);

    [[nodiscard]] Expected<void> watch(int file, FileID number, Watched::Role role);
    [[nodiscard]] Expected<void> mark(int file, unsigned action, Watched::Role role);
    void take(std::span<const std::byte> bytes, Drained& drained, const Sink& sink);
    [[nodiscard]] Resolved resolve(const FanotifyRecord& record);
    static void tell(const FanotifyRecord& record, const Resolved& resolved, const Sink& sink);
    static void tellRename(const FanotifyRecord& record, const Resolved& resolved,
                           const Sink& sink);

    const UniqueFD group_;
    const std::string reason_;
    const std::uint64_t queueLimit_;
    const std::shared_ptr<FanotifyCalls> calls_;
    KernelQueue queue_;
    std::atomic<std::uint64_t> events_ = 0;
    std::atomic<std::uint64_t> overflows_ = 0;
    mutable Mutex mutex_;
    WatchTable<std::string> watched_ MARROWDALE_GUARDED_BY(mutex_);  // by FileHandle::bytes
};

}  // namespace marrowdale::native
