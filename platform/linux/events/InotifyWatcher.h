#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <span>
#include <string>
#include <unordered_map>

#include "platform/foundation/Mutex.h"
#include "platform/linux/events/InotifyCalls.h"
#include "platform/linux/events/InotifyRecords.h"
#include "platform/linux/events/KernelQueue.h"
#include "platform/linux/events/WatchTable.h"
#include "platform/linux/events/Watcher.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// Listens through watches of inotify, one for each folder. A rename comes as two events with one
// cookie, which are put together when both come in one drain; the handle of what was moved is not
// told.
class InotifyWatcher final : public Watcher {
  public:
    // `reason`: for Status. Errors: what inotify_init1 says (the operation's name).
    [[nodiscard]] static Expected<std::unique_ptr<InotifyWatcher>> create(
        std::string reason, std::shared_ptr<InotifyCalls> calls = std::make_shared<InotifyCalls>());

    // Sets a watch on the open folder and clears it. Errors: the operation is the call that failed.
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

    // Where something was moved from, until the other half of the rename comes.
    struct OldPlace {
        FileID folder{};
        std::string name;
    };

    InotifyWatcher(UniqueFD group, std::string reason, std::shared_ptr<InotifyCalls> calls);

    [[nodiscard]] Expected<void> watch(int file, FileID number, Watched::Role role);
    // The number of the watch.
    [[nodiscard]] Expected<int> add(int file, Watched::Role role);
    void take(std::span<const std::byte> bytes, Drained& drained, const Sink& sink);
    [[nodiscard]] std::optional<Watched> resolve(const InotifyRecord& record);
    void tell(const InotifyRecord& record, const Watched& watched, const Sink& sink);

    const UniqueFD group_;
    const std::string reason_;
    const std::uint64_t queueLimit_;
    const std::shared_ptr<InotifyCalls> calls_;
    KernelQueue queue_;
    std::unordered_map<std::uint32_t, OldPlace> moves_;  // by cookie; of the drain that runs
    std::atomic<std::uint64_t> events_ = 0;
    std::atomic<std::uint64_t> overflows_ = 0;
    mutable Mutex mutex_;
    WatchTable<int> watched_ MARROWDALE_GUARDED_BY(mutex_);  // by the kernel's number of the watch
};

}  // namespace marrowdale::native
