#pragma once

#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>

namespace marrowdale {

// Owns the objects that the extension needs once in a world: made at first use, gone with the
// world. Any thread.
class SharedObjects {
  public:
    SharedObjects() = default;
    SharedObjects(const SharedObjects&) = delete;
    SharedObjects& operator=(const SharedObjects&) = delete;

    // The object of that name, default-made at first use. A name goes with one type for ever.
    template <typename T>
    [[nodiscard]] T& get(std::string_view name) {
        const std::lock_guard lock(mutex_);
        auto& slot = objects_[std::string(name)];
        if (!slot) {
            slot = std::make_shared<T>();
        }
        return *static_cast<T*>(slot.get());
    }

  private:
    std::mutex mutex_;
    std::map<std::string, std::shared_ptr<void>> objects_;  // guarded by mutex_
};

}  // namespace marrowdale
