#pragma once

#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale {

// Keeps what one page brought. One thread.
class CollectingObserver : public FileProviderEnumerationObserver {
  public:
    void didEnumerateItems(std::vector<FileProviderItemPtr> items) override {
        ++batches;
        pageItems.insert(pageItems.end(), items.begin(), items.end());
    }
    void finishEnumeratingUpToPage(std::optional<Data> page) override {
        ++finishes;
        nextPage = std::move(page);
    }
    void finishEnumeratingWithError(const Error& failure) override {
        ++finishes;
        error = failure;
    }
    [[nodiscard]] std::vector<std::string> filenames() const {
        std::vector<std::string> names;
        for (const auto& item : pageItems) {
            names.push_back(item->filename);
        }
        return names;
    }

    std::vector<FileProviderItemPtr> pageItems;
    std::optional<Data> nextPage;
    std::optional<Error> error;
    int batches = 0;
    int finishes = 0;
};

}  // namespace marrowdale
