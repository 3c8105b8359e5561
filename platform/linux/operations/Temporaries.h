#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <string>

#include "platform/foundation/Error.h"
#include "platform/foundation/Identifiers.h"
#include "platform/foundation/Log.h"
#include "platform/foundation/UUID.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::native {

// The hidden folders in which things are made, or taken apart, before or after they show. Each is
// noted on disk before it is made, in a file of its own (docs/formats/temporaries.md), so that what
// a killed process left is found again by its note and by nothing else. Any thread.
//
// A folder, not a name beside the final one: what is made in it has its final name at once, nobody
// else can look into it, and what leaves it comes from another folder, which no rule about saves
// within a folder takes for a new version of an older document.
class Temporaries {
  public:
    // The notes lie in the folder "temporaries" of the state folder, made when missing. `log` may
    // be null; both outlive the object.
    [[nodiscard]] static Expected<std::unique_ptr<Temporaries>> open(const std::string& stateFolder,
                                                                     Log* log);

    // Where the folder of that number stands now; as DocumentIndex::pathForFileID.
    using FolderFinder = std::function<Expected<std::string>(FileID folder)>;
    // Removes what is noted, and the notes: for the start, when no operation runs. What can't be
    // removed is logged and stays noted.
    void sweep(const FolderFinder& finder);

    // A temporary folder; removed with what is in it when it goes, and so is its note.
    class Folder {
      public:
        Folder(Folder&& other) noexcept = default;
        Folder& operator=(Folder&&) = delete;
        ~Folder();

        [[nodiscard]] int descriptor() const { return descriptor_.get(); }

      private:
        friend class Temporaries;
        Folder(Temporaries* owner, UniqueFD in, std::string path, const UUID& id)
            : owner_(owner), in_(std::move(in)), path_(std::move(path)), id_(id) {}

        Temporaries* owner_;
        UniqueFD in_;       // the folder it is in
        std::string path_;  // of that folder, for error texts
        UUID id_;
        UniqueFD descriptor_;
    };
    // How a folder is noted: for a cut of the power as well, or for the end of the process alone.
    enum class Noting : std::uint8_t { synced, unsynced };
    // Makes one (mode 0700) in the open folder, which is at `path`. Errors: POSIX, those of the
    // state folder among them.
    [[nodiscard]] Expected<Folder> make(int folder, const std::string& path,
                                        Noting noting = Noting::synced);

    // Makes removals end at their next checkpoint; what they leave is swept at the next start.
    void stop() { stopping_ = true; }
    [[nodiscard]] const std::atomic<bool>& isStopping() const { return stopping_; }

    // The name that a temporary folder of that number has.
    [[nodiscard]] static std::string nameOf(const UUID& id);

  private:
    Temporaries(std::string notes, Log* log) : notes_(std::move(notes)), log_(log) {}

    [[nodiscard]] std::string noteOf(const UUID& id) const { return notes_ + "/" + id.text(); }
    [[nodiscard]] Expected<void> note(const UUID& id, int folder, const std::string& path,
                                      Noting noting) const;
    void forget(const UUID& id) const;
    void sweepOne(const std::string& name, const FolderFinder& finder);
    [[nodiscard]] bool removeFrom(int folder, const std::string& path, const UUID& id) const;
    void tell(const Error& error) const;

    std::string notes_;
    Log* log_;
    std::atomic<bool> stopping_ = false;
};

}  // namespace marrowdale::native
