#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <string_view>
#include <unordered_map>
#include <utility>
#include <vector>

#include "platform/foundation/Identifiers.h"
#include "platform/linux/store/Index.h"
#include "platform/linux/store/OwnMoves.h"
#include "platform/linux/store/TreeChanges.h"

namespace marrowdale::native {

// Keeps document identifiers with documents when programs save by replacing the file. An
// identifier goes with its file in every rename and move, but it stays with the name
//
// - when a file of the same folder is renamed onto the name, or exchanged with it;
// - when the file was unlinked and, within 15 seconds, another of the folder is renamed there;
// - when the file was renamed to a back-up's name, or to any name of the folder under which it is
//   unlinked within 15 seconds, and within that time the name was taken again;
// - when all that is known is the result, after a time in which nothing was watched: the name has
//   another file, and the earlier one is nowhere, or stands under a back-up's name and went there
//   within 15 seconds of the new one's birth.
//
// Never across folders, never for a file that is newly made where one was unlinked, and never where
// the file left, or the other came, by our own doing (OwnMoves). A document whose file turns up
// again within 15 seconds of its going has its identifier back. Of several that left one name
// before this was asked to decide, the first keeps it: the others were given out to what stood
// there in between, by requests that came before the decision.
//
// One thread at a time, as the index.
class SafeSaves {
  public:
    using Clock = std::chrono::steady_clock;
    static constexpr std::chrono::seconds window{15};

    // How a file came to stand at a name.
    enum class Arrival : std::uint8_t {
        unknown,
        made,
        renamedWithin,  // its folder
        movedIn,        // from another folder
    };
    enum class Knowledge : std::uint8_t {
        live,    // arrivals were told of as they happened
        result,  // only the result is known
    };
    // An identifier that came to rest on another file.
    struct Transfer {
        std::uint32_t document = 0;
        RowNumber to = noRow;
        CarriedAttributes attributes;  // of the earlier file
    };

    SafeSaves(Index& index, TreeChanges& changes, OwnMoves& own)
        : index_(index), changes_(changes), own_(own) {}

    // What a hint told of a name; `fromName` with renamedWithin. The last word on a name counts,
    // but being made is no news of one that was renamed there.
    void arrived(FileID folder, std::string_view name, Arrival how, std::string_view fromName);

    // A file was renamed away from that name, to another of the folder.
    void renamedAway(FileID folder, std::string_view name);

    // Decides, once the index is as the disk is, but for rows in limbo, which are gone now.
    [[nodiscard]] std::vector<Transfer> settle(DeviceID device, Knowledge knowledge,
                                               Clock::time_point now);

    // Gives a row that was made just now the identifier that its file had before it went.
    void revive(RowNumber number);

  private:
    struct Came {
        Arrival how = Arrival::unknown;
        std::string fromName;
    };
    // A name that a document left.
    struct Vacancy {
        std::uint32_t document = 0;
        FileID folder{};
        std::string name;
        FileID file{};
        bool isFolder = false;  // a package
        std::uint32_t fingerprint = 0;
        std::int64_t birth = 0;
        Clock::time_point since;
        CarriedAttributes attributes;
        bool wasRenamed = false;  // and not unlinked at once
        bool isOwn = false;       // the file left by our own doing
        Came taken;
    };
    enum class Fate : std::uint8_t { wait, forget, transfer, exchange };
    using Name = std::pair<FileID, std::string>;  // in a folder
    // Vacancies are numbered in the order in which they came.
    using Number = std::uint64_t;

    // Each answers the vacancies that have news.
    void takeArrivals(std::set<Number>& news);
    void takeDepartures(Clock::time_point now, std::set<Number>& news);
    void add(TreeChanges::Departure departure, Clock::time_point now, std::set<Number>& news);
    void forget(Number number);
    void forgetOld(Clock::time_point now);
    [[nodiscard]] bool decide(Vacancy& vacancy, DeviceID device, Knowledge knowledge);
    [[nodiscard]] Fate fateOf(Vacancy& vacancy, RowNumber taker, RowNumber old,
                              Knowledge knowledge) const;
    [[nodiscard]] Fate fateWhenGone(const Vacancy& vacancy, Knowledge knowledge) const;
    [[nodiscard]] Fate fateWhenThere(const Vacancy& vacancy, RowNumber taker, RowNumber old,
                                     Knowledge knowledge) const;
    [[nodiscard]] RowNumber folderRow(FileID folder) const;
    [[nodiscard]] RowNumber placedRowOf(std::uint32_t document) const;
    void transfer(const Vacancy& vacancy, RowNumber taker, DeviceID device);
    void exchange(const Vacancy& vacancy, RowNumber taker, RowNumber old, DeviceID device);
    void noteLeft(std::uint32_t document);
    void setDocument(RowNumber number, std::uint32_t document);

    Index& index_;
    TreeChanges& changes_;
    OwnMoves& own_;
    std::map<Name, Came> arrivals_;
    std::set<Name> renamedAway_;
    std::map<Number, Vacancy> vacancies_;
    std::multimap<Name, Number> byName_;
    std::unordered_multimap<std::uint32_t, Number> byDocument_;
    std::unordered_multimap<std::uint64_t, Number> byFile_;
    Number next_ = 0;
    std::vector<Transfer> transfers_;
    std::set<RowNumber> decided_;  // have the document of their name, by this decision
};

}  // namespace marrowdale::native
