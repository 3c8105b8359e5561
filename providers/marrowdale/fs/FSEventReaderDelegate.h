#pragma once

#include <memory>
#include <string>

#include "platform/services/FileEventService.h"
#include "providers/marrowdale/items/LocalItem.h"

namespace marrowdale {

// Who is told what an FSEventReader read. Called on the reader's queue, one call at a time, in the
// order of the events. A call may stop the reader, start it again, or let go of it; what else the
// event and its batch hold is then not told.
class FSEventReaderDelegate {
  public:
    virtual ~FSEventReaderDelegate() = default;

    // An item stands at the URL of `item` that was made, changed or moved there; `item` was just
    // made from what is there. `event` is good for the length of the call.
    virtual void fsEventReaderDidChangeItem(const std::shared_ptr<LocalItem>& item,
                                            const FileEvent& event) = 0;
    // The item of that identifier is gone from `path`. One event may tell of two identifiers, one
    // right after the other: "fid=" with the number of the file that stood there, and "did=" when
    // the document is gone from the volume too.
    virtual void fsEventReaderDidDeleteItem(const std::string& identifier, const std::string& path,
                                            const FileEvent& event) = 0;
    // Everything older than the start of the stream was told. `eventID` is the identifier of the
    // event that says so.
    virtual void fsEventReaderDidFinishHistory(EventID eventID) = 0;
    // Events were lost, or their identifiers began again: start over. What still comes says nothing
    // of what was missed.
    virtual void fsEventReaderMustReset() = 0;
};

}  // namespace marrowdale
