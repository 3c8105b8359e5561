#include "providers/marrowdale/fs/FSDirectoryEnumerator.h"

#include <algorithm>
#include <memory>
#include <utility>

namespace marrowdale {

namespace {

// One run of a request.
class Walk {
  public:
    Walk(const FSDirectoryEnumerator& request, const Platform& platform,
         std::vector<URL>& collected, std::unique_ptr<DirectoryEnumerator> restingWalk)
        : request_(request),
          platform_(platform),
          collected_(collected),
          restingWalk_(std::move(restingWalk)) {}

    Expected<FSDirectoryEnumerator::Result> run() {
        std::size_t root = 0;
        if (request_.startPosition) {
            root = request_.startPosition->root;
            position_ = request_.offset;
        }
        for (; root < request_.urls.size() && room() > 0 && goesOn_; ++root) {
            if (const auto walked = walkRoot(root); !walked) {
                return Unexpected(walked.error());
            }
        }
        return FSDirectoryEnumerator::Result{position_, std::move(nextPosition_),
                                             std::move(restingWalk_)};
    }

  private:
    // Entries that may still be handed out.
    std::uint64_t room() const {
        return request_.limit - (position_ - std::min(position_, request_.offset));
    }

    Expected<void> walkRoot(std::size_t root) {
        const URL& url = request_.urls[root];
        auto enumerator = open(root);
        if (!enumerator) {
            platform_.log.error("can't create file enumerator at " + url.path());
            return {};
        }
        auto walked = passOver(**enumerator);
        if (walked && position_ >= request_.offset) {
            walked = handOut(**enumerator);
        }
        if (!walked) {
            // The handler said stop and has been told why; or the whole page is lost.
            return goesOn_ ? walked : Expected<void>();
        }
        if (room() == 0) {
            nextPosition_ = FSWalkPosition{root, (*enumerator)->position()};
            restingWalk_ = std::move(*enumerator);
        }
        return {};
    }

    Expected<std::unique_ptr<DirectoryEnumerator>> open(std::size_t root) {
        const URL& url = request_.urls[root];
        DirectoryEnumerationRequest request{.url = url,
                                            .keys = request_.keys,
                                            .attributeNames = request_.attributeNames,
                                            .prefetchStatus = true,
                                            .options = optionsFor(url),
                                            .position = {},
                                            .errorHandler = {}};
        request.errorHandler = [this](const URL& folder, const Error& error) {
            return tell(folder, error);
        };
        auto resting = std::exchange(restingWalk_, nullptr);
        if (request_.startPosition && request_.startPosition->root == root) {
            if (resting && resting->takeUp(request.errorHandler)) {
                return resting;
            }
            request.position = request_.startPosition->position;
        }
        return platform_.fileSystem.enumerateDirectory(request);
    }

    DirectoryEnumerationOptions optionsFor(const URL& url) const {
        if (request_.directoryEnumerationOptionsFor) {
            if (const auto options = request_.directoryEnumerationOptionsFor(url)) {
                return *options;
            }
        }
        return {.skipSubdirectoryDescendants = !request_.recursively,
                .skipPackageDescendants = true,
                .skipHiddenFiles = true};
    }

    Expected<void> passOver(DirectoryEnumerator& enumerator) {
        if (position_ >= request_.offset) {
            return {};
        }
        const auto passed = enumerator.skip(request_.offset - position_);
        if (!passed) {
            return Unexpected(passed.error());
        }
        position_ += *passed;
        return {};
    }

    Expected<void> handOut(DirectoryEnumerator& enumerator) {
        const auto before = collected_.size();
        const auto walked = enumerator.next(room(), collected_);
        if (!walked) {
            position_ += collected_.size() - before;
            return Unexpected(walked.error());
        }
        position_ += *walked;
        return {};
    }

    bool tell(const URL& url, const Error& error) {
        if (request_.errorHandler) {
            goesOn_ = request_.errorHandler(url, error);
        } else {
            platform_.log.error("can't enumerate " + url.path() + "; " + error.description());
        }
        return goesOn_;
    }

    const FSDirectoryEnumerator& request_;
    const Platform& platform_;
    std::vector<URL>& collected_;
    std::uint64_t position_ = 0;
    bool goesOn_ = true;
    std::optional<FSWalkPosition> nextPosition_;
    // Before the first root the walk to go on with, at the end the one that reached the limit.
    std::unique_ptr<DirectoryEnumerator> restingWalk_;
};

}  // namespace

Expected<FSDirectoryEnumerator::Result> FSDirectoryEnumerator::enumerate(
    const Platform& platform, std::vector<URL>& collected,
    std::unique_ptr<DirectoryEnumerator> restingWalk) const {
    if (limit == 0) {
        return Result{};
    }
    return Walk(*this, platform, collected, std::move(restingWalk)).run();
}

}  // namespace marrowdale
