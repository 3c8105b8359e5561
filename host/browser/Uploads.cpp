#include "host/browser/Uploads.h"

#include <cerrno>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <unistd.h>

#include "host/browser/HttpResponse.h"
#include "host/browser/Secrets.h"
#include "host/requests/FeedJson.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

namespace {

constexpr std::size_t longestName = 255;

bool isName(std::string_view name) {
    return !name.empty() && name.size() <= longestName && name != "." && name != ".." &&
           !name.contains('/') && !name.contains('\0');
}

// The page shows how far the sending is; the rest is the file system's.
class SilentObserver final : public ActionObserver {
  public:
    void progressed(const ActionProgress& /*progress*/) override {}
    void warned(const std::string& /*text*/) override {}
};

}  // namespace

class Uploads::Sink final : public ContentSink {
  public:
    Sink(ActionRequests& actions, std::string folder, std::string parent, std::string name)
        : actions_(actions),
          folder_(std::move(folder)),
          path_(folder_ + "/" + name),
          parent_(std::move(parent)) {}
    ~Sink() override {
        file_.reset();
        std::error_code ignored;
        std::filesystem::remove_all(folder_, ignored);
    }
    Sink(const Sink&) = delete;
    Sink& operator=(const Sink&) = delete;

    [[nodiscard]] Expected<void> open() {
        constexpr mode_t ours = 0700;
        constexpr mode_t readable = 0666;
        if (::mkdir(folder_.c_str(), ours) != 0) {
            return Unexpected(errorWithPOSIXCode(errno, "make the folder", folder_));
        }
        file_.reset(
            ::open(path_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, readable));
        return file_ ? Expected<void>() : Unexpected(errorWithPOSIXCode(errno, "make", path_));
    }
    Expected<void> write(std::span<const char> bytes) override {
        while (!bytes.empty()) {
            const ssize_t count = ::write(file_.get(), bytes.data(), bytes.size());
            if (count < 0 && errno != EINTR) {
                return Unexpected(errorWithPOSIXCode(errno, "write", path_));
            }
            bytes = bytes.subspan(static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
        }
        return {};
    }
    BrowserResponse finish(const std::stop_token& gone) override {
        file_.reset();
        ItemAction action;
        action.kind = ItemAction::Kind::import;
        action.path = path_;
        action.parent = parent_;
        SilentObserver observer;
        const auto item = actions_.perform(action, observer, gone);
        return item ? responseOf(ApiAnswer{.body = itemJson(**item)}) : responseOf(item.error());
    }
    BrowserResponse failed(const Error& error) override { return responseOf(error); }

  private:
    ActionRequests& actions_;
    const std::string folder_;
    const std::string path_;
    const std::string parent_;
    native::UniqueFD file_;
};

Uploads::Uploads(ItemRequests& items, ActionRequests& actions, std::string folder)
    : items_(items), actions_(actions), folder_(std::move(folder)) {
    std::error_code ignored;  // an upload tells what is wrong with the folder
    std::filesystem::remove_all(folder_, ignored);
}

Expected<std::unique_ptr<ContentSink>> Uploads::begin(std::string_view parent,
                                                      std::string_view name) {
    if (!isName(name)) {
        return Unexpected(errorInvalidParameter("name", name));
    }
    const auto folder = items_.item(parent);
    if (!folder) {
        return Unexpected(folder.error());
    }
    if (!(*folder)->isFolder() || ((*folder)->capabilities & allowsWriting) == 0) {
        return Unexpected(errorFileWriteNoPermission());
    }
    // Told before much is sent; whoever takes the name later is found by the import.
    const std::string path = (*folder)->fileURL.path() + "/" + std::string(name);
    if (const auto taken = items_.identifierAt(path)) {
        if (auto item = items_.item(*taken)) {
            return Unexpected(collisionErrorForItem(std::move(*item)));
        }
    }
    constexpr mode_t ours = 0700;
    if (::mkdir(folder_.c_str(), ours) != 0 && errno != EEXIST) {
        return Unexpected(errorWithPOSIXCode(errno, "make the folder", folder_));
    }
    auto sink = std::make_unique<Sink>(actions_, folder_ + "/" + newSecret(), std::string(parent),
                                       std::string(name));
    if (auto opened = sink->open(); !opened) {
        return Unexpected(opened.error());
    }
    return sink;
}

}  // namespace marrowdale::host
