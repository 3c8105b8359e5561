#include "platform/linux/store/SafeSaves.h"

#include <algorithm>
#include <cstdlib>

#include "platform/linux/store/BackupNames.h"

namespace marrowdale::native {

namespace {

constexpr std::int64_t windowNanoseconds =
    std::chrono::duration_cast<std::chrono::nanoseconds>(SafeSaves::window).count();

bool isNear(std::int64_t a, std::int64_t b) {
    return std::llabs(a - b) <= windowNanoseconds;
}

}  // namespace

void SafeSaves::arrived(FileID folder, std::string_view name, Arrival how,
                        std::string_view fromName) {
    Came& came = arrivals_[{folder, std::string(name)}];
    if (how == Arrival::made && came.how != Arrival::unknown) {
        return;
    }
    came = {how, std::string(fromName)};
}

void SafeSaves::renamedAway(FileID folder, std::string_view name) {
    renamedAway_.emplace(folder, name);
}

RowNumber SafeSaves::folderRow(FileID folder) const {
    for (const RowNumber number : index_.rowsOfFile(raw(folder))) {
        if (index_.row(number).isFolder() && !index_.row(number).has(Row::limbo)) {
            return number;
        }
    }
    return noRow;
}

RowNumber SafeSaves::placedRowOf(std::uint32_t document) const {
    for (const RowNumber number : index_.rowsOfDocument(document)) {
        std::string path;
        if (index_.path(number, path)) {
            return number;
        }
    }
    return noRow;
}

// A hint knows better than the index how a file came.
void SafeSaves::takeArrivals(std::set<Number>& news) {
    for (const auto& arrival : changes_.takeArrivals()) {
        const bool within = arrival.folder == arrival.fromFolder;
        Came& came = arrivals_[{arrival.folder, arrival.name}];
        if (came.how == Arrival::unknown || came.how == Arrival::made) {
            came = {within ? Arrival::renamedWithin : Arrival::movedIn,
                    within ? arrival.fromName : std::string()};
        }
    }
    for (const auto& [name, came] : arrivals_) {
        const auto [first, last] = byName_.equal_range(name);
        for (auto at = first; at != last; ++at) {
            vacancies_.at(at->second).taken = came;
            news.insert(at->second);
        }
    }
    arrivals_.clear();
}

void SafeSaves::takeDepartures(Clock::time_point now, std::set<Number>& news) {
    for (auto& departure : changes_.takeDepartures()) {
        // A document that left a name before, and leaves another now.
        const auto [first, last] = byDocument_.equal_range(departure.document);
        bool isKnown = false;
        for (auto at = first; at != last; ++at) {
            news.insert(at->second);
            const Vacancy& vacancy = vacancies_.at(at->second);
            isKnown =
                isKnown || (vacancy.folder == departure.folder && vacancy.name == departure.name);
        }
        if (!isKnown) {
            add(std::move(departure), now, news);
        }
    }
}

void SafeSaves::add(TreeChanges::Departure departure, Clock::time_point now,
                    std::set<Number>& news) {
    Vacancy vacancy;
    vacancy.document = departure.document;
    vacancy.folder = departure.folder;
    vacancy.name = std::move(departure.name);
    vacancy.file = departure.file;
    vacancy.isFolder = departure.isFolder;
    vacancy.since = now;
    vacancy.isOwn = own_.takeLeaving({vacancy.folder, vacancy.name, vacancy.file});
    vacancy.wasRenamed = renamedAway_.contains({vacancy.folder, vacancy.name});
    vacancy.birth = departure.birth;
    vacancy.fingerprint = departure.fingerprint;
    vacancy.attributes = std::move(departure.attributes);
    const Number number = next_++;
    byName_.emplace(Name{vacancy.folder, vacancy.name}, number);
    byDocument_.emplace(vacancy.document, number);
    byFile_.emplace(raw(vacancy.file), number);
    vacancies_.emplace(number, std::move(vacancy));
    news.insert(number);
}

void SafeSaves::forget(Number number) {
    const auto vacancy = vacancies_.find(number);
    const auto drop = [number](auto& table, const auto& key) {
        const auto [first, last] = table.equal_range(key);
        for (auto at = first; at != last; ++at) {
            if (at->second == number) {
                table.erase(at);
                return;
            }
        }
    };
    drop(byName_, Name{vacancy->second.folder, vacancy->second.name});
    drop(byDocument_, vacancy->second.document);
    drop(byFile_, raw(vacancy->second.file));
    vacancies_.erase(vacancy);
}

void SafeSaves::forgetOld(Clock::time_point now) {
    while (!vacancies_.empty() && now - vacancies_.begin()->second.since > window) {
        forget(vacancies_.begin()->first);
    }
}

std::vector<SafeSaves::Transfer> SafeSaves::settle(DeviceID device, Knowledge knowledge,
                                                   Clock::time_point now) {
    forgetOld(now);
    std::set<Number> news;
    takeDepartures(now, news);
    renamedAway_.clear();
    takeArrivals(news);
    for (const Number number : news) {
        if (!decide(vacancies_.at(number), device, knowledge)) {
            forget(number);
        }
    }
    decided_.clear();
    return std::exchange(transfers_, {});
}

// Whether the vacancy is to be kept.
bool SafeSaves::decide(Vacancy& vacancy, DeviceID device, Knowledge knowledge) {
    const RowNumber folder = folderRow(vacancy.folder);
    if (folder == noRow) {
        return false;
    }
    const RowNumber taker = index_.child(folder, vacancy.name);
    const RowNumber old = placedRowOf(vacancy.document);
    switch (fateOf(vacancy, taker, old, knowledge)) {
        case Fate::transfer:
            transfer(vacancy, taker, device);
            return false;
        case Fate::exchange:
            exchange(vacancy, taker, old, device);
            return false;
        case Fate::wait:
            return true;
        case Fate::forget:
            break;
    }
    return false;
}

SafeSaves::Fate SafeSaves::fateOf(Vacancy& vacancy, RowNumber taker, RowNumber old,
                                  Knowledge knowledge) const {
    if (taker != noRow && index_.row(taker).document == vacancy.document) {
        return Fate::forget;  // it is back
    }
    if (decided_.contains(taker)) {
        return Fate::forget;  // the name is an earlier one's
    }
    if (old != noRow) {
        const RowNumber oldFolder = index_.row(old).parent;
        if (oldFolder == noRow || index_.row(oldFolder).fileID != raw(vacancy.folder)) {
            return Fate::forget;  // moved to another folder
        }
        vacancy.wasRenamed = true;
    }
    if (taker == noRow) {
        return Fate::wait;
    }
    if (index_.row(taker).isFolder() != vacancy.isFolder) {
        return Fate::forget;
    }
    if (vacancy.taken.how == Arrival::movedIn || vacancy.isOwn ||
        own_.hasArrived({vacancy.folder, vacancy.name, FileID{index_.row(taker).fileID}})) {
        return Fate::forget;
    }
    return old != noRow ? fateWhenThere(vacancy, taker, old, knowledge)
                        : fateWhenGone(vacancy, knowledge);
}

SafeSaves::Fate SafeSaves::fateWhenGone(const Vacancy& vacancy, Knowledge knowledge) const {
    if (knowledge == Knowledge::result) {
        return Fate::transfer;
    }
    switch (vacancy.taken.how) {
        case Arrival::renamedWithin:
            return Fate::transfer;
        case Arrival::made:
            return vacancy.wasRenamed ? Fate::transfer : Fate::forget;
        case Arrival::unknown:
            return Fate::wait;  // a request saw it before the hint was read
        case Arrival::movedIn:
            break;
    }
    return Fate::forget;
}

SafeSaves::Fate SafeSaves::fateWhenThere(const Vacancy& vacancy, RowNumber taker, RowNumber old,
                                         Knowledge knowledge) const {
    const bool isBackup = isBackupName(vacancy.name, index_.name(old));
    if (knowledge == Knowledge::result) {
        const bool together = isNear(index_.row(old).changed, index_.row(taker).birth);
        return isBackup && together ? Fate::transfer : Fate::forget;
    }
    if (vacancy.taken.how == Arrival::unknown) {
        return Fate::wait;
    }
    if (isBackup) {
        return Fate::transfer;
    }
    const bool isExchange =
        vacancy.taken.how == Arrival::renamedWithin && vacancy.taken.fromName == index_.name(old);
    return isExchange ? Fate::exchange : Fate::wait;
}

// All names of the row's file.
void SafeSaves::setDocument(RowNumber number, std::uint32_t document) {
    const Row row = index_.row(number);
    for (const RowNumber name : index_.rowsOfFile(row.fileID)) {
        const Row& other = index_.row(name);
        if (areOneFile(other, row) && other.document != document) {
            index_.setDocument(name, document);
            if (!other.has(Row::limbo)) {
                changes_.changed(name);
            }
        }
    }
}

// Of a file with several names, whoever knows one of them must hear that the identifier left it:
// the name where it comes to rest may be hidden from him.
void SafeSaves::noteLeft(std::uint32_t document) {
    std::vector<RowNumber> names = index_.rowsOfDocument(document);
    std::erase_if(names, [this](RowNumber name) { return index_.row(name).has(Row::limbo); });
    if (names.size() > 1) {
        for (const RowNumber name : names) {
            changes_.documentLeft(name, document);
        }
    }
}

void SafeSaves::transfer(const Vacancy& vacancy, RowNumber taker, DeviceID device) {
    const std::uint32_t earlier = index_.row(taker).document;
    noteLeft(vacancy.document);
    for (const RowNumber number : index_.rowsOfDocument(vacancy.document)) {
        index_.setDocument(number, 0);
        if (!index_.row(number).has(Row::limbo)) {
            changes_.changed(number);  // the back-up gets an identifier of its own
        }
    }
    setDocument(taker, vacancy.document);
    decided_.insert(taker);
    if (earlier != 0) {
        changes_.documentGone(taker, earlier);
    }
    changes_.changed(taker);
    changes_.documentMoved(device, vacancy.document, raw(vacancy.file), index_.row(taker).fileID);
    transfers_.push_back({vacancy.document, taker, vacancy.attributes});
}

void SafeSaves::exchange(const Vacancy& vacancy, RowNumber taker, RowNumber old, DeviceID device) {
    const std::uint32_t other = index_.row(taker).document;
    const CarriedAttributes others = index_.attributes(taker);
    noteLeft(vacancy.document);
    if (other != 0) {
        noteLeft(other);
    }
    setDocument(taker, 0);
    setDocument(old, other);
    setDocument(taker, vacancy.document);
    changes_.changed(taker);
    changes_.changed(old);
    changes_.documentMoved(device, vacancy.document, raw(vacancy.file), index_.row(taker).fileID);
    transfers_.push_back({vacancy.document, taker, vacancy.attributes});
    if (other != 0) {
        changes_.documentMoved(device, other, index_.row(taker).fileID, index_.row(old).fileID);
        transfers_.push_back({other, old, others});
    }
}

void SafeSaves::revive(RowNumber number) {
    const Row& row = index_.row(number);
    if (row.document != 0) {
        return;
    }
    const auto [first, last] = byFile_.equal_range(row.fileID);
    for (auto at = first; at != last; ++at) {
        const Vacancy& vacancy = vacancies_.at(at->second);
        const bool sameFile = vacancy.birth == row.birth &&
                              vacancy.fingerprint == row.fingerprint &&
                              (row.birth != 0 || row.fingerprint != 0);
        if (sameFile && index_.rowsOfDocument(vacancy.document).empty()) {
            index_.setDocument(number, vacancy.document);
            return;
        }
    }
}

}  // namespace marrowdale::native
