#pragma once

#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/hostframework/FileProviderExtension.h"
#include "tests/changes/Answer.h"

namespace marrowdale::tests {

inline constexpr std::string_view workingSet = VantrelWorkingSetContainerItemIdentifier;

// A client of a provider: enumerates everything below the root once, and goes by the changes of the
// working set from then on. It knows identifiers, parents and records, and no disk.
class Replica {
  public:
    // Takes everything that is there, folder by folder, in place of what is known; from now on its
    // anchor is one that was asked for before that.
    void fill(FileProviderExtension& provider);
    // Asks for changes, each time from a fresh enumerator, until nothing more comes. False when the
    // anchor is expired.
    [[nodiscard]] bool catchUp(FileProviderExtension& provider);

    // How many requests the last catchUp took.
    [[nodiscard]] int requests() const { return requests_; }
    [[nodiscard]] const Data& anchor() const { return anchor_; }
    void setAnchor(Data anchor) { anchor_ = std::move(anchor); }
    [[nodiscard]] std::size_t count() const { return items_.size(); }
    // Differences between the picture and a fresh enumeration; empty when there are none.
    [[nodiscard]] std::vector<std::string> differences(FileProviderExtension& provider) const;

  private:
    void apply(const Answer& answer);
    void remove(const std::string& identifier);
    void note(const std::string& identifier, const std::string& line);
    [[nodiscard]] std::string toldOf(const std::string& identifier) const;

    std::map<std::string, FileProviderItemPtr> items_;
    std::map<std::string, std::vector<std::string>> told_;  // by identifier, for failures
    Data anchor_;
    int requests_ = 0;
};

using ItemsByIdentifier = std::multimap<std::string, FileProviderItemPtr>;

// Everything below the root, by enumerating folder by folder. Starts over when a page expires.
[[nodiscard]] ItemsByIdentifier enumerateAll(FileProviderExtension& provider);

[[nodiscard]] std::optional<Data> currentAnchor(FileProviderExtension& provider,
                                                std::string_view container);

}  // namespace marrowdale::tests
