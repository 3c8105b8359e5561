#pragma once

#include <chrono>
#include <memory>
#include <string>
#include <utility>

#include "platform/foundation/Identifiers.h"

namespace marrowdale::native {

// What this system itself moved and removed of late. A program that saves a document may remove it
// and rename another file to its name; whoever is asked to do the same means two documents. So the
// store never takes one of these for a way of saving.
//
// Told before it is done, for the store may look before the call that does it returns. Any thread.
class OwnMoves {
  public:
    using Clock = std::chrono::steady_clock;
    // How long it is remembered: a few times as long as SafeSaves waits for the end of a save.
    static constexpr std::chrono::seconds kept{60};

    OwnMoves();
    ~OwnMoves();
    OwnMoves(const OwnMoves&) = delete;
    OwnMoves& operator=(const OwnMoves&) = delete;

    // A file at a name of a folder.
    struct Place {
        FileID folder{};
        std::string name;
        FileID file{};
        friend auto operator<=>(const Place&, const Place&) = default;
    };
    enum class Kind : std::uint8_t { leaves, isRemoved, arrives };

    // Taken back when the object goes, unless it was done.
    class Note {
      public:
        Note(OwnMoves* moves, Kind kind, Place place)
            : moves_(moves), what_(kind, std::move(place)) {
            if (moves_ != nullptr) {
                moves_->add(what_);
            }
        }
        Note(const Note&) = delete;
        Note& operator=(const Note&) = delete;
        ~Note() {
            if (moves_ != nullptr && !isDone_) {
                moves_->takeBack(what_);
            }
        }
        void wasDone() { isDone_ = true; }

      private:
        friend class OwnMoves;
        OwnMoves* moves_;
        std::pair<Kind, Place> what_;
        bool isDone_ = false;
    };

    // Whether the file left the name by our doing. Asked once of each leaving: the number and the
    // name may be another file's by the next.
    [[nodiscard]] bool takeLeaving(const Place& place);
    // Whether the file came to the name by our doing.
    [[nodiscard]] bool hasArrived(const Place& place) const;
    // Whether something was removed that nobody has asked about yet.
    [[nodiscard]] bool hasRemovals() const;

  private:
    using What = std::pair<Kind, Place>;
    class Notes;

    void add(const What& what);
    void takeBack(const What& what);

    std::unique_ptr<Notes> notes_;
};

}  // namespace marrowdale::native
