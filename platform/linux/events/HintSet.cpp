#include "platform/linux/events/HintSet.h"

#include <algorithm>
#include <tuple>
#include <utility>

namespace marrowdale::native {

void HintSet::add(const WatchHint& hint) {
    if (hint.folder == FileID{}) {
        if (hint.file != FileID{}) {
            files_.push_back(hint.file);
        }
        return;
    }
    merge({.what = hint.what,
           .folder = hint.folder,
           .name = std::string(hint.name),
           .fromFolder = hint.fromFolder,
           .fromName = std::string(hint.fromName),
           .fingerprint = hint.fingerprint});
}

void HintSet::add(const Hint& hint) {
    merge(hint);
}

void HintSet::merge(Hint hint) {
    std::string key(reinterpret_cast<const char*>(&hint.folder), sizeof hint.folder);
    key += hint.name;
    const auto [at, isNew] = places_.try_emplace(std::move(key), hint);
    if (isNew) {
        return;
    }
    Hint& known = at->second;
    known.what |= hint.what;
    if ((hint.what & WatchHint::movedTo) != 0) {
        known.fromFolder = hint.fromFolder;
        known.fromName = std::move(hint.fromName);
        known.fingerprint = hint.fingerprint;
    }
}

std::vector<HintSet::Hint> HintSet::takePlaces() {
    std::vector<Hint> places;
    places.reserve(places_.size());
    for (auto& [key, hint] : places_) {
        places.push_back(std::move(hint));
    }
    places_.clear();
    std::ranges::sort(places, {},
                      [](const Hint& hint) { return std::tie(hint.folder, hint.name); });
    return places;
}

std::vector<FileID> HintSet::takeFiles() {
    std::vector<FileID> files = std::exchange(files_, {});
    std::ranges::sort(files);
    const auto repeated = std::ranges::unique(files);
    files.erase(repeated.begin(), repeated.end());
    return files;
}

}  // namespace marrowdale::native
