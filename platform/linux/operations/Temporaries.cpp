#include "platform/linux/operations/Temporaries.h"

#include <array>
#include <cerrno>
#include <fcntl.h>
#include <optional>
#include <sys/stat.h>
#include <utility>

#include "platform/linux/files/DirectoryReader.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/operations/TreeRemoval.h"
#include "platform/linux/store/Bytes.h"
#include "platform/linux/store/DiskFile.h"
#include "platform/linux/store/Envelope.h"

namespace marrowdale::native {

namespace {

constexpr Magic noteMagic{'M', 'R', 'W', 'T', 'E', 'M', 'P', '\0'};
constexpr std::string_view unfinished = ".new";

// The folder that a temporary one is in. Its device is left out: it changes from boot to boot.
struct Note {
    FileID folder{};
    Date birth;
    bool hasBirth = false;
    std::string path;

    [[nodiscard]] bool isOf(const EntryStatus& status) const {
        return status.isDirectory() && status.fileID == folder && status.hasBirth == hasBirth &&
               status.birth == birth;
    }
};

std::vector<std::byte> encoded(const UUID& id, const Note& note) {
    ByteWriter body;
    body.put(raw(note.folder));
    body.put(note.birth.seconds);
    body.put(note.birth.nanoseconds);
    body.put(std::uint32_t{note.hasBirth ? 1U : 0U});
    body.textWithLength(note.path);
    return encodeEnvelope(noteMagic, id, body.bytes());
}

Expected<Note> readNote(const std::string& path, const UUID& id) {
    const auto file = DiskFile::open(path, O_RDONLY);
    const auto envelope = file ? readEnvelope(*file, noteMagic) : Unexpected(file.error());
    if (!envelope) {
        return Unexpected(envelope.error());
    }
    ByteReader body(envelope->body);
    Note note;
    note.folder = FileID{body.take<std::uint64_t>()};
    note.birth.seconds = body.take<std::int64_t>();
    note.birth.nanoseconds = body.take<std::uint32_t>();
    note.hasBirth = body.take<std::uint32_t>() != 0;
    note.path = body.takeTextWithLength();
    if (!body.finished() || envelope->store != id) {
        return Unexpected(errorWithPOSIXCode(EBADMSG, "read the note", path));
    }
    return note;
}

// The folder of a note, at the path where it was or where it is now. No value when it is gone.
Expected<std::optional<UniqueFD>> folderOf(Note& note, const Temporaries::FolderFinder& finder) {
    for (const bool moved : {false, true}) {
        if (moved) {
            auto path = finder(note.folder);
            if (!path) {
                return path.error().code == ENOENT ? Expected<std::optional<UniqueFD>>(std::nullopt)
                                                   : Unexpected(path.error());
            }
            note.path = std::move(*path);
        }
        auto folder = openFolder(note.path);
        const auto status = folder ? statEntry(folder->get(), "") : Unexpected(folder.error());
        if (status && note.isOf(*status)) {
            return std::optional(std::move(*folder));
        }
        const bool isElsewhere = status || folder.error().code == ENOENT ||
                                 folder.error().code == ENOTDIR || folder.error().code == ELOOP;
        if (!isElsewhere) {
            return Unexpected(status.error());
        }
    }
    return std::optional<UniqueFD>();
}

}  // namespace

Expected<std::unique_ptr<Temporaries>> Temporaries::open(const std::string& stateFolder, Log* log) {
    const std::string notes = stateFolder + "/temporaries";
    if (const auto made = makeFolders(notes); !made) {
        return Unexpected(made.error());
    }
    return std::unique_ptr<Temporaries>(new Temporaries(notes, log));
}

std::string Temporaries::nameOf(const UUID& id) {
    return ".marrowdale-" + id.text();
}

void Temporaries::sweep(const FolderFinder& finder) {
    const auto names = namesIn(notes_);
    if (!names) {
        tell(names.error());
        return;
    }
    for (const std::string& name : *names) {
        sweepOne(name, finder);
    }
}

void Temporaries::sweepOne(const std::string& name, const FolderFinder& finder) {
    const std::string path = notes_ + "/" + name;
    if (name.ends_with(unfinished)) {
        // Its folder was not made yet.
        if (const auto removed = removeFile(path); !removed) {
            tell(removed.error());
        }
        return;
    }
    const auto id = UUID::fromText(name);
    if (!id) {
        return;
    }
    auto note = readNote(path, *id);
    if (!note) {
        tell(note.error());
        return;
    }
    const auto folder = folderOf(*note, finder);
    if (!folder) {
        tell(folder.error());
        return;
    }
    if (!*folder || removeFrom((*folder)->get(), note->path, *id)) {
        forget(*id);
    }
}

bool Temporaries::removeFrom(int folder, const std::string& path, const UUID& id) const {
    OperationRun run(OperationProgress::Kind::deleting, nullptr, stopping_, log_);
    const std::string name = nameOf(id);
    const auto removed = removeTree(folder, name, path + "/" + name, run);
    if (!removed && !stopping_) {
        tell(removed.error());
    }
    return removed.has_value();
}

void Temporaries::forget(const UUID& id) const {
    if (const auto removed = removeFile(noteOf(id)); !removed) {
        tell(removed.error());
    }
}

void Temporaries::tell(const Error& error) const {
    if (log_ != nullptr) {
        log_->error("can't tidy up after an operation on files; " + error.description());
    }
}

Expected<void> Temporaries::note(const UUID& id, int folder, const std::string& path,
                                 Noting noting) const {
    const bool isSynced = noting == Noting::synced;
    const auto status = statEntry(folder, "");
    if (!status) {
        return Unexpected(status.error());
    }
    const auto bytes = encoded(id, {status->fileID, status->birth, status->hasBirth, path});
    const std::string fresh = noteOf(id) + std::string(unfinished);
    const auto file = DiskFile::open(fresh, O_WRONLY | O_CREAT | O_EXCL);
    auto done = file ? file->write(bytes, 0) : Unexpected(file.error());
    if (done && isSynced) {
        done = file->sync();
    }
    if (done) {
        done = renameFile(fresh, noteOf(id));
    }
    if (done && isSynced) {
        done = syncFolder(notes_);
    }
    if (!done && file) {
        static_cast<void>(removeFile(fresh));
        static_cast<void>(removeFile(noteOf(id)));
    }
    return done;
}

Expected<Temporaries::Folder> Temporaries::make(int folder, const std::string& path,
                                                Noting noting) {
    const UUID id = UUID::random();
    UniqueFD in(::openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!in) {
        return Unexpected(errorWithPOSIXCode(errno, "make a temporary folder in", path));
    }
    if (const auto noted = note(id, folder, path, noting); !noted) {
        return Unexpected(noted.error());
    }
    const std::string name = nameOf(id);
    if (::mkdirat(folder, name.c_str(), 0700) != 0) {
        const int code = errno;
        forget(id);
        return Unexpected(errorWithPOSIXCode(code, "make a temporary folder in", path));
    }
    Folder made(this, std::move(in), path, id);
    auto opened = openFolderBeneath(folder, name);
    if (!opened) {
        return Unexpected(opened.error());
    }
    made.descriptor_ = std::move(*opened);
    return made;
}

Temporaries::Folder::~Folder() {
    if (in_ && owner_->removeFrom(in_.get(), path_, id_)) {
        owner_->forget(id_);
    }
}

}  // namespace marrowdale::native
