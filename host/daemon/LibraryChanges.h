#pragma once

#include <cstdint>
#include <deque>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "host/daemon/LibraryList.h"
#include "platform/foundation/Data.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/Log.h"
#include "platform/foundation/Mutex.h"
#include "platform/foundation/PropertyList.h"
#include "platform/linux/files/LinuxApplicationSupport.h"

namespace marrowdale::host {

// How the app libraries changed, kept in the state folder, so that anchors of older versions of
// their list stay good when nobody kept an enumerator for them: after a kill, a restart, or when
// many applications came and went.
//
// An enumerator answers from its own version of the list alone, or somebody who knows of no
// library: him it tells all of them, and what happened since the anchor's event. So an older anchor
// is handed on as one that knows of none, and what is missing then is known here:
//
// - which libraries its holder may have been told of, for those that are gone must be told so;
// - since which event the documents of the libraries that came later were recorded. The anchor's
//   own event may lie behind that, for a library is recorded before the list has it; then the
//   anchor is moved to before it came.
//
// What is on disk is there before the store records anything of a new library, on a full disk too.
// Where it can't be written, it is removed, and anchors of older versions are expired after a
// restart. Any thread.
class LibraryChanges {
  public:
    // Changes that are remembered; an anchor from before them is not known.
    static constexpr std::size_t most = 256;

    // `dataHome`: where the extension keeps its lists. The log may be null.
    LibraryChanges(const std::string& stateFolder, const std::string& dataHome, Log* log);

    // Once, with the state folder locked: these libraries are recorded. Reads what earlier runs
    // noted; what differs from that was recorded behind that event, the last one of these runs.
    void begin(const std::vector<std::string>& identifiers, EventID last);
    // These are recorded from now on, by events behind that one. Before they are.
    void note(const std::vector<std::string>& identifiers, EventID last);
    // A refresh was done. Where its version of the list has the libraries of now, it has all
    // changes that were noted since the version before.
    void listIsKnown();

    struct Bridge {
        Data anchor;                  // for somebody who knows of no library
        bool isMoved = false;         // whether it is of an earlier event
        std::set<std::string> known;  // items of libraries that the holder may have been told of
    };
    // None for an anchor of a version that is not known here, and for one that knows of no library.
    [[nodiscard]] std::optional<Bridge> bridge(const Data& anchor) const;

  private:
    struct Change {
        std::uint64_t through = 0;      // no version after this one is without the change
        EventID last{};                 // before it
        std::vector<std::string> gone;  // the libraries that went
    };
    void add(std::vector<std::string> identifiers, EventID last) MARROWDALE_REQUIRES(mutex_);
    void forgetOld() MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] bool read() MARROWDALE_REQUIRES(mutex_);
    void write() MARROWDALE_REQUIRES(mutex_);
    [[nodiscard]] LibraryList list() const;

    Log* const log_;
    const URL fileURL_;
    const URL listURL_;
    mutable native::LinuxApplicationSupport state_;
    mutable native::LinuxApplicationSupport lists_;
    mutable Mutex mutex_;
    std::uint64_t unknown_ MARROWDALE_GUARDED_BY(mutex_) = 0;  // versions up to this are
    std::vector<std::string> now_ MARROWDALE_GUARDED_BY(mutex_);
    std::deque<Change> changes_ MARROWDALE_GUARDED_BY(mutex_);  // oldest first
    bool isWritten_ MARROWDALE_GUARDED_BY(mutex_) = false;      // as it is now
};

}  // namespace marrowdale::host
