#include "host/daemon/KeptEnumerators.h"

#include <algorithm>
#include <utility>

#include "host/daemon/AnchorVersions.h"

namespace marrowdale::host {

KeptEnumerators::~KeptEnumerators() {
    for (const Kept& kept : kept_) {
        kept.enumerator->invalidate();
    }
}

std::unique_ptr<FileProviderEnumerator> KeptEnumerators::take(std::string_view container,
                                                              const Data& anchor) {
    const auto version = libraryVersionIn(anchor);
    const std::lock_guard lock(mutex_);
    const auto found = std::ranges::find_if(kept_, [&](const Kept& kept) {
        return kept.container == container && kept.version == version;
    });
    if (found == kept_.end()) {
        return nullptr;
    }
    auto enumerator = std::move(found->enumerator);
    kept_.erase(found);
    return enumerator;
}

void KeptEnumerators::keep(std::string_view container, const Data& anchor,
                           std::unique_ptr<FileProviderEnumerator> enumerator) {
    const auto version = libraryVersionIn(anchor);
    // Outside of the lock: to invalidate waits for what the enumerator does.
    std::unique_ptr<FileProviderEnumerator> leaving;
    {
        const std::lock_guard lock(mutex_);
        // Version 0 is everybody's who was told of no library yet, and such an enumerator is never
        // brought further: a fresh one knows what came meanwhile.
        if (!version || *version == 0 || count(container, *version) >= mostOfOneVersion) {
            leaving = std::move(enumerator);
        } else {
            kept_.push_back({std::string(container), *version, std::move(enumerator)});
            if (kept_.size() > most) {
                leaving = std::move(kept_.front().enumerator);
                kept_.pop_front();
            }
        }
    }
    if (leaving) {
        leaving->invalidate();
    }
}

std::size_t KeptEnumerators::count(std::string_view container, std::uint64_t version) const {
    return static_cast<std::size_t>(std::ranges::count_if(kept_, [&](const Kept& kept) {
        return kept.container == container && kept.version == version;
    }));
}

}  // namespace marrowdale::host
