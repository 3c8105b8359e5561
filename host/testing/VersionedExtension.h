#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/daemon/AnchorVersions.h"
#include "host/testing/FakeExtension.h"
#include "platform/foundation/PropertyList.h"
#include "platform/foundation/SerialQueue.h"

namespace marrowdale::host {

// An extension whose lists of app libraries have versions: of the registry as it was last read, and
// of what the working set knows. An enumerator answers from its own version alone, and is brought
// up to the newest by a request for changes. Refreshes are done on a queue, as told. Any thread.
class VersionedExtension : public FakeExtension {
  public:
    struct State {
        std::mutex mutex;
        std::uint64_t registry = 0;    // what the next refresh reads
        std::uint64_t main = 0;        // what was read last
        std::uint64_t workingSet = 0;  // what the working set was brought up to
        std::vector<std::string> events;
        int started = 0;
        int alive = 0;
    };
    const std::shared_ptr<State> state = std::make_shared<State>();

    // What the next refresh reads.
    void install() {
        const std::lock_guard lock(state->mutex);
        ++state->registry;
    }
    [[nodiscard]] std::vector<std::string> events() const {
        const std::lock_guard lock(state->mutex);
        return state->events;
    }
    [[nodiscard]] int started() const {
        const std::lock_guard lock(state->mutex);
        return state->started;
    }
    [[nodiscard]] static Data anchorOf(std::uint64_t version) {
        return encodePropertyList(PropertyList(PropertyListDictionary{
                                      {anchorLibraryVersionKey, PropertyList(version)}}))
            .value();
    }

    [[nodiscard]] Expected<std::unique_ptr<FileProviderEnumerator>>
    enumeratorForContainerItemIdentifier(std::string_view container) override {
        return std::unique_ptr<FileProviderEnumerator>(
            std::make_unique<Enumerator>(state, std::string(container)));
    }
    void _refreshInstalledAppsWithCompletionHandler(std::function<void()> handler) override {
        queue_.async([this, handler = std::move(handler)]() mutable {
            if (handler) {
                handlers_.push_back(std::move(handler));
            }
            {
                const std::lock_guard lock(state->mutex);
                state->main = state->registry;
                state->events.emplace_back("refresh");
            }
            for (const auto& each : handlers_) {
                each();
            }
        });
    }

  private:
    class Enumerator final : public FileProviderEnumerator {
      public:
        Enumerator(std::shared_ptr<State> state, std::string container)
            : state_(std::move(state)), container_(std::move(container)) {
            const std::lock_guard lock(state_->mutex);
            version_ = isWorkingSet() ? state_->workingSet : state_->main;
            ++state_->alive;
        }
        Enumerator(const Enumerator&) = delete;
        Enumerator& operator=(const Enumerator&) = delete;
        ~Enumerator() override {
            const std::lock_guard lock(state_->mutex);
            --state_->alive;
        }
        void enumerateItemsForObserver(FileProviderEnumerationObserver& observer,
                                       const Data& /*page*/) override {
            observer.finishEnumeratingUpToPage(std::nullopt);
        }
        void enumerateChangesForObserver(std::shared_ptr<FileProviderChangeObserver> observer,
                                         const Data& anchor) override {
            const auto since = libraryVersionIn(anchor).value();
            bool isKnown = false;
            {
                const std::lock_guard lock(state_->mutex);
                isKnown = since == 0 || since == version_;
                if (isKnown && (since != 0 || isWorkingSet())) {
                    version_ = state_->main;
                    state_->workingSet = isWorkingSet() ? version_ : state_->workingSet;
                }
                state_->events.push_back("changes " + container_ + " since " +
                                         std::to_string(since) + (isKnown ? "" : ": expired"));
            }
            if (isKnown) {
                observer->finishEnumeratingChangesUpToSyncAnchor(anchorOf(version_),
                                                                 MoreComing::no);
            } else {
                observer->finishEnumeratingWithError(errorSyncAnchorExpired());
            }
        }
        void currentSyncAnchorWithCompletionHandler(
            const std::function<void(const std::optional<Data>&)>& handler) override {
            handler(anchorOf(version_));
        }
        void start() override {
            const std::lock_guard lock(state_->mutex);
            isStarted_ = true;
            ++state_->started;
        }
        void stop() override {
            const std::lock_guard lock(state_->mutex);
            state_->started -= std::exchange(isStarted_, false) ? 1 : 0;
        }
        void invalidate() override { stop(); }

      private:
        [[nodiscard]] bool isWorkingSet() const {
            return container_ == VantrelWorkingSetContainerItemIdentifier;
        }
        const std::shared_ptr<State> state_;
        const std::string container_;
        std::uint64_t version_ = 0;
        bool isStarted_ = false;
    };

    std::vector<std::function<void()>> handlers_;  // on the queue
    SerialQueue queue_{"versioned"};
};

}  // namespace marrowdale::host
