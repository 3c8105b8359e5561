#pragma once

#include <string>

#include "platform/linux/operations/WorkPlaces.h"
#include "platform/linux/store/OwnMoves.h"

namespace marrowdale::native {

// What the store is told of an operation while it is under way; `moves` may be null. Taken back
// when the note goes, unless it `wasDone`.

// An item leaves its name. What can't be said of it (it is not served, or its folder can't be
// looked at) is left unsaid.
[[nodiscard]] OwnMoves::Note noteLeaving(OwnMoves* moves, OwnMoves::Kind kind,
                                         const WorkItem& item);

// A file comes to a name of an open folder.
[[nodiscard]] OwnMoves::Note noteArrival(OwnMoves* moves, FileID file, int folder,
                                         const std::string& name);

}  // namespace marrowdale::native
