#pragma once

#include <optional>
#include <string>
#include <vector>

#include "platform/foundation/Error.h"
#include "platform/linux/events/HintSet.h"
#include "platform/linux/store/Reconciler.h"

namespace marrowdale::native {

// Brings the index to what is on disk at the places that hints name. The other user, beside the
// reconcile, of the code that merges what is found; made for one batch. Looks are made without the
// mutex, each folder opened once.
class LiveUpdate {
  public:
    // What a batch led to that could not be done.
    struct Left {
        // Hints whose folder did not stand where the index has it: it was moved a moment ago, which
        // is a hint of its own that was not read yet.
        std::vector<HintSet::Hint> hints;
        // The root was moved, removed or unmounted.
        bool rootMoved = false;
        // Folders not listed yet that were moved before they could be.
        std::vector<RowNumber> missedFolders;
    };

    explicit LiveUpdate(const TreeScope& scope);

    // Looks at every place, lists folders that never were, and puts in limbo what is not where it
    // was. Errors: a folder can't be listed for want of memory or descriptors.
    [[nodiscard]] Expected<Left> process(HintSet& hints);

  private:
    // What a look at one place brought.
    struct Found {
        const HintSet::Hint* hint = nullptr;
        bool isThere = false;
        bool isHidden = false;  // something else is mounted there, or it is left out
        EntryLook look;
        std::optional<std::uint32_t> digest;  // of a folder
    };

    void addFilePlaces(HintSet& hints) MARROWDALE_EXCLUDES(mutex_);
    void processFolder(const std::vector<HintSet::Hint>& hints, std::size_t first,
                       std::size_t last);
    // The folder, open, where it stands; no value when it is not known; none open when it is not
    // where the index has it.
    [[nodiscard]] std::optional<UniqueFD> openFolderOf(FileID folder) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Found look(int folder, const HintSet::Hint& hint) MARROWDALE_EXCLUDES(mutex_);
    [[nodiscard]] Found lookAtFolderItself(int folder, const HintSet::Hint& hint) const;
    void lookClosely(int folder, const HintSet::Hint& hint, Found& found);
    void merge(const Found& found) MARROWDALE_EXCLUDES(mutex_);
    void tellArrival(const HintSet::Hint& hint, const Found& found) MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] RowNumber folderRow(FileID folder) const MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] bool isInLimbo(FileID folder) const MARROWDALE_REQUIRES(mutex_);

    const TreeScope& scope_;
    Mutex& mutex_;
    EntryMerger merger_;
    Left left_;
    std::vector<RowNumber> toList_;
};

}  // namespace marrowdale::native
