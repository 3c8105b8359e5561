#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <string_view>

#include "host/daemon/AppRefreshRequests.h"
#include "host/daemon/ToldLibraries.h"
#include "platform/foundation/SerialQueue.h"
#include "platform/hostframework/FileProviderExtension.h"

namespace marrowdale::host {

// What a host does so that an extension's answers about app libraries are those of this moment: it
// has the registry of applications read before anything else is asked, and brings the working set
// up to what was found, then and after every later refresh. Any thread; outlives no extension.
class AppLibraries {
  public:
    // `known` (may be null) is called after the first and after every later refresh, once the
    // working set knows of it, by whoever waits for that; `changed` (may be null) after it, on a
    // queue of its own, when a later refresh brought another version of the libraries. Neither is
    // called after this object is gone.
    explicit AppLibraries(FileProviderExtension& extension, std::function<void()> changed = nullptr,
                          std::function<void()> known = nullptr);

    ~AppLibraries();
    AppLibraries(const AppLibraries&) = delete;
    AppLibraries& operator=(const AppLibraries&) = delete;

    // Returns once the first refresh was done, and the working set knows of it. To be called
    // before every request that the extension answers.
    void waitUntilKnown();
    // Asks for a refresh, and leaves it to come.
    void ask() { refreshes_.ask(); }
    // Returns once a refresh that began after the call, or after the extension was made, was done
    // and everybody knows of it.
    void refreshNow();

    // See ToldLibraries.
    void complete(const Data& since, ItemChanges& changes) { told_.complete(since, changes); }

  private:
    void refreshed();
    void follow();
    void bringUp();
    // Has the working set brought up to the newest version, which is answered; none where anchors
    // tell of no version. Asks once at least, for what libraries there are.
    std::optional<std::uint64_t> prime();
    void askForAll(FileProviderEnumerator& workingSet, const Data& anchor);
    [[nodiscard]] std::optional<Data> freshAnchor(std::string_view container) const;

    FileProviderExtension& extension_;
    const std::function<void()> changed_;
    const std::function<void()> knownTo_;
    ToldLibraries told_;
    std::atomic<bool> wasRefreshed_ = false;
    std::once_flag known_;
    std::atomic<bool> isKnown_ = false;
    // Written once under known_, then on the queue.
    std::optional<std::uint64_t> version_;
    SerialQueue queue_{"marrowdale.host.app-libraries"};
    AppRefreshRequests refreshes_;  // calls what stands above
};

}  // namespace marrowdale::host
