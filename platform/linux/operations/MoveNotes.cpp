#include "platform/linux/operations/MoveNotes.h"

#include "platform/linux/files/EntryStatus.h"

namespace marrowdale::native {

namespace {

OwnMoves::Note note(OwnMoves* moves, OwnMoves::Kind kind, int folder, const std::string& name,
                    FileID file) {
    const auto status = moves != nullptr ? statEntry(folder, "") : Expected<EntryStatus>();
    const bool canBeSaid = moves != nullptr && status;
    return {canBeSaid ? moves : nullptr, kind, {canBeSaid ? status->fileID : FileID{}, name, file}};
}

}  // namespace

OwnMoves::Note noteLeaving(OwnMoves* moves, OwnMoves::Kind kind, const WorkItem& item) {
    return note(item.place.hasParent() ? moves : nullptr, kind, item.folder(), item.name(),
                item.status.fileID);
}

OwnMoves::Note noteArrival(OwnMoves* moves, FileID file, int folder, const std::string& name) {
    return note(moves, OwnMoves::Kind::arrives, folder, name, file);
}

}  // namespace marrowdale::native
