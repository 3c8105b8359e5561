#pragma once

#include <compare>
#include <cstdint>
#include <string>
#include <string_view>
#include <unordered_map>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/linux/files/PackageTypes.h"
#include "platform/linux/store/EventBatch.h"
#include "platform/linux/store/Index.h"

namespace marrowdale::native {

// Makes events of what is done to the index. Whoever brings the index to what is on disk says what
// it found through here; when all of a batch is done, `flush` turns it into events: what is gone
// first, then what appeared, changed or was renamed, under the paths that hold at the end.
//
// A folder has events of its own for appearing, going, being renamed and for its own metadata; one
// that moved within the tree has two, and what is in it none. What lies inside a package is a
// change of the package. One thread at a time, as the index.
class TreeChanges {
  public:
    TreeChanges(Index& index, const PackageTypes& packages) : index_(index), packages_(packages) {}

    // While on, nothing is noted: for a store that is filled for the first time, of which nobody
    // can have asked before.
    void setSilent(bool silent) { silent_ = silent; }

    // Of placed rows.
    void appeared(RowNumber number) { touch(number, Row::touchedAppeared); }
    void appearedWithAllBelow(RowNumber folder);
    void changed(RowNumber number) { touch(number, Row::touchedChanged); }
    // It stands where it stood, but was away for a moment. Whoever was told of it, or of something
    // below it, and looked in that moment, took it for gone.
    void returned(RowNumber number) { touch(number, Row::touchedRenamed); }
    // The document came to rest on another file.
    void documentMoved(DeviceID device, std::uint32_t document, std::uint64_t from,
                       std::uint64_t to);
    // The file of that row had this document and has it no more, and no other file has.
    void documentGone(RowNumber number, std::uint32_t document);
    // The file of that row, which stands, had this document and has it no more: another file has.
    void documentLeft(RowNumber number, std::uint32_t document);

    // Takes a placed row off its place: it may be found elsewhere before `remove`.
    void leave(RowNumber number);
    // Places a row that is in limbo. False when there is no room for the name.
    [[nodiscard]] bool arrive(RowNumber number, RowNumber folder, std::string_view name);
    // Frees a row that is in limbo, and all below it.
    void remove(RowNumber number);

    // A place that a document left, and a place that a moved row came to, since they were last
    // taken.
    struct Departure {
        std::uint32_t document = 0;
        FileID file{};
        std::int64_t birth = 0;
        std::uint32_t fingerprint = 0;
        bool isFolder = false;  // a package
        FileID folder{};
        std::string name;
        CarriedAttributes attributes;
    };
    struct Arrival {
        FileID folder{};
        std::string name;
        FileID fromFolder{};
        std::string fromName;
    };
    // Notes again what left when the run before made its last commit, and was found nowhere yet:
    // whose the name is was not decided.
    void recallDepartures();
    [[nodiscard]] std::vector<Departure> takeDepartures();
    [[nodiscard]] std::vector<Arrival> takeArrivals();

    // The folders that were freed since this was last asked.
    [[nodiscard]] std::vector<FileID> takeRemovedFolders();

    // Whether there is something to flush.
    [[nodiscard]] bool hasChanges() const;
    // Appends the events of everything noted so far. What is in limbo is told to be gone from where
    // it was: its number may be another file's by the next time, and a later run would not know the
    // place any more.
    void flush(EventBatch& batch);

  private:
    struct Place {
        std::string path;
        RowNumber package = noRow;  // the topmost one above
    };
    // What the events so far say of a row that has left its place.
    struct Told {
        Place place;
        bool wasPackage = false;
        bool isGone = false;             // that it is not there any more
        std::uint32_t goneDocument = 0;  // to be told yet
    };
    struct Left {
        Told told;
        FileID folder{};
    };
    struct GoneDocument {
        RowNumber row;
        std::uint32_t document;
        auto operator<=>(const GoneDocument&) const = default;
    };
    enum class Side : std::uint8_t { gone, appeared };

    void touch(RowNumber number, std::uint32_t bits);
    void noteDeparture(RowNumber number, FileID folder);
    [[nodiscard]] Place placeOf(RowNumber number) const;
    // Where the events so far say that it is: deletions are of what somebody was told of.
    [[nodiscard]] Place toldPlaceOf(RowNumber number) const;
    [[nodiscard]] bool isPackage(RowNumber number) const;
    [[nodiscard]] std::uint32_t kindFlags(RowNumber number) const;
    // The row's document when no other row has it; the row has none afterwards.
    [[nodiscard]] std::uint32_t takeDocument(RowNumber number);
    void putGone(RowNumber number, const std::string& path, std::uint32_t flags,
                 std::uint32_t document);
    // Whether a name of the document is served, beside those that lie in packages.
    [[nodiscard]] bool hasServedName(std::uint32_t document) const;
    // A name of that file is told to be gone: whoever goes by the file's number is to know that it
    // has others.
    void noteOtherNames(RowNumber number);
    // The same for the files below a folder that was somewhere else, or nowhere, for somebody.
    void noteOtherNamesBelow(RowNumber folder);
    // It is not there any more; perhaps it was moved.
    void tellGone(RowNumber number, const Told& told);
    void tellOutOfSight(RowNumber number, const Told& told);
    // It is nowhere any more. The row is about to be freed.
    void tellRemoved(RowNumber number, const Told& told);
    void putGoneDocument(const std::string& path, std::uint32_t document);
    // Events for what lies below a folder that stands, or stood, at `path`.
    void putBelow(RowNumber folder, const std::string& path, Side side, bool forgets);
    // The row and all below it are about to be freed.
    void noteRemoved(RowNumber number);
    void flushLimbo();
    void flushTouched();
    void flushRow(RowNumber number, std::uint32_t bits);
    void flushMove(RowNumber number, Told told, const Place& now);
    void flushGoneDocuments();
    void flushPackages();
    void flushOtherNames();

    Index& index_;
    const PackageTypes& packages_;
    bool silent_ = false;
    std::vector<RowNumber> touched_;  // have one of the row's touched bits; some may be free by now
    std::unordered_map<RowNumber, Left> left_;   // in limbo
    std::unordered_map<RowNumber, Told> moved_;  // placed again, and not told of yet
    std::vector<RowNumber> packagesChanged_;
    std::vector<RowNumber> otherNames_;
    std::vector<RowNumber> told_;  // by the flush that runs, where they stand
    std::vector<GoneDocument> goneDocuments_;
    std::vector<Departure> departures_;
    std::vector<Arrival> arrivals_;
    std::vector<FileID> removedFolders_;
    EventBatch gone_;
    EventBatch rest_;
};

}  // namespace marrowdale::native
