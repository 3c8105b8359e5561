#include "platform/linux/store/OwnMoves.h"

#include <algorithm>
#include <map>

#include "platform/linux/store/Mutex.h"

namespace marrowdale::native {

class OwnMoves::Notes {
  public:
    void add(const What& what) {
        const MutexLock lock(mutex_);
        const auto now = Clock::now();
        if (times_.size() >= enough_) {
            std::erase_if(times_, [&](const auto& note) { return now - note.second > kept; });
            enough_ = std::max(fewest, 2 * times_.size());
        }
        times_.insert_or_assign(what, now);
    }
    bool take(const What& what) {
        const MutexLock lock(mutex_);
        return times_.erase(what) > 0;
    }
    bool has(const What& what) {
        const MutexLock lock(mutex_);
        const auto note = times_.find(what);
        return note != times_.end() && Clock::now() - note->second <= kept;
    }
    bool hasAny(Kind kind) {
        const MutexLock lock(mutex_);
        return std::ranges::any_of(times_,
                                   [kind](const auto& note) { return note.first.first == kind; });
    }

  private:
    static constexpr std::size_t fewest = 1'024;

    Mutex mutex_;
    std::map<What, Clock::time_point> times_ MARROWDALE_GUARDED_BY(mutex_);
    std::size_t enough_ MARROWDALE_GUARDED_BY(mutex_) = fewest;  // before old ones are looked for
};

OwnMoves::OwnMoves() : notes_(std::make_unique<Notes>()) {}
OwnMoves::~OwnMoves() = default;

bool OwnMoves::takeLeaving(const Place& place) {
    const bool left = notes_->take({Kind::leaves, place});
    return notes_->take({Kind::isRemoved, place}) || left;
}

bool OwnMoves::hasArrived(const Place& place) const {
    return notes_->has({Kind::arrives, place});
}

bool OwnMoves::hasRemovals() const {
    return notes_->hasAny(Kind::isRemoved);
}

void OwnMoves::add(const What& what) {
    notes_->add(what);
}

void OwnMoves::takeBack(const What& what) {
    static_cast<void>(notes_->take(what));
}

}  // namespace marrowdale::native
