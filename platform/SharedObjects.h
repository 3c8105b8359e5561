#pragma once

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>

namespace marrowdale {

// Owns the objects that the extension needs once in a world: made at first use, gone with the
// world, the last one made first. Any thread.
class SharedObjects {
  public:
    SharedObjects() = default;
    SharedObjects(const SharedObjects&) = delete;
    SharedObjects& operator=(const SharedObjects&) = delete;
    // Later objects may refer to earlier ones.
    ~SharedObjects() {
        while (takeLast() != nullptr) {
        }
    }

    // The object of that name, default-made at first use. A name goes with one type for ever.
    template <typename T>
    [[nodiscard]] T& get(std::string_view name) {
        return get<T>(name, [] { return std::make_shared<T>(); });
    }

    // The same, made by `make` at first use. `make` may ask for other objects; whoever asks for
    // this one meanwhile waits for it.
    template <typename T>
    [[nodiscard]] T& get(std::string_view name, const std::function<std::shared_ptr<T>()>& make) {
        const std::shared_ptr<Slot> slot = slotNamed(name);
        std::call_once(slot->made, [&] {
            slot->object = make();
            const std::lock_guard lock(mutex_);
            slot->order = ++made_;
        });
        return *static_cast<T*>(slot->object.get());
    }

  private:
    struct Slot {
        std::once_flag made;
        std::shared_ptr<void> object;
        unsigned order = 0;
    };
    // Null when none is left. Without the lock it goes, for it may ask for others meanwhile.
    std::shared_ptr<Slot> takeLast() {
        const std::lock_guard lock(mutex_);
        auto last = slots_.begin();
        for (auto slot = slots_.begin(); slot != slots_.end(); ++slot) {
            last = slot->second->order > last->second->order ? slot : last;
        }
        return last == slots_.end() ? nullptr : std::move(slots_.extract(last).mapped());
    }
    std::shared_ptr<Slot> slotNamed(std::string_view name) {
        const std::lock_guard lock(mutex_);
        auto& slot = slots_[std::string(name)];
        if (!slot) {
            slot = std::make_shared<Slot>();
        }
        return slot;
    }

    std::mutex mutex_;
    std::map<std::string, std::shared_ptr<Slot>> slots_;  // guarded by mutex_
    unsigned made_ = 0;                                   // guarded by mutex_
};

}  // namespace marrowdale
