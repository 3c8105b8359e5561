#pragma once

#include <cstdint>
#include <expected>
#include <functional>
#include <memory>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>
#include <vector>

// Programs talk to a running `marrowdale serve` through this library: look items up, list folders,
// hold an anchor, be told that something changed, and ask what. Everything here can also be had
// over the service's socket, by the protocol of docs/api.md.
//
// Texts are bytes as the file system has them; identifiers, pages and anchors are to be handed back
// as they came. Calls wait for their answer, and throw nothing but std::bad_alloc.
namespace marrowdale::client {

// Why a call failed. `name` is one of "noSuchItem", "syncAnchorExpired", "filenameCollision",
// "invalidParameter", "writeNoPermission", "unableToGetDeviceUUID", "posix" and "other"; with
// "posix" the code is an errno: ENOENT and ECONNREFUSED where no service runs, ECONNRESET where it
// ended meanwhile.
struct Error {
    std::string domain;
    int code = 0;
    std::string name;
    std::string message;  // one line for people
};

template <typename T>
using Result = std::expected<T, Error>;

// Since 1970-01-01T00:00:00 UTC, without leap seconds; nanoseconds count forward.
struct Time {
    std::int64_t seconds = 0;
    std::uint32_t nanoseconds = 0;
    friend auto operator<=>(const Time&, const Time&) = default;
};

// One file or folder, as it was when it was asked for.
struct Item {
    std::string itemIdentifier;        // lasts through renames, moves and safe saves
    std::string parentItemIdentifier;  // the root's parent is the root itself
    std::string filename;
    std::string typeIdentifier;                 // a MIME type
    std::optional<std::uint64_t> documentSize;  // bytes; none for folders
    std::optional<Time> creationDate;
    std::optional<Time> contentModificationDate;
    std::optional<std::uint64_t> childItemCount;  // subfolders; none for files
    std::uint64_t capabilities = 0;  // read 1, write 2, move 4, rename 8, trash 16, delete 32
    std::string versionIdentifier;   // changes when the content does
    bool isTrashed = false;
    std::optional<Time> lastUsedDate;
    std::vector<std::string> tags;
    std::optional<double> favoriteRank;
    std::optional<std::uint64_t> fileID;  // the inode's number
    std::optional<std::uint64_t> docID;
    std::string path;
    bool isFolder = false;
    bool isContainer = false;  // an application's document folder
    std::optional<std::string> appContainerBundleIdentifier;
};

// Containers that are always there, beside the folders.
inline constexpr std::string_view rootContainer = "VantrelRootContainerItemIdentifier";
inline constexpr std::string_view workingSetContainer = "VantrelWorkingSetContainerItemIdentifier";
inline constexpr std::string_view allDirectoriesContainer =
    "VantrelAllDirectoriesContainerItemIdentifier";

// One page of a listing. A page that has expired (something was deleted meanwhile) is
// "syncAnchorExpired": the listing is to be begun again.
struct Page {
    std::vector<Item> items;
    std::optional<std::string> next;  // none at the end
};

// What changed since an anchor. Apply `deleted` first, then `updated`; a deleted "fid=N" also means
// the item that is known by `fileID` N, and with a folder goes everything that is known in it.
struct Changes {
    std::vector<Item> updated;
    std::vector<std::string> deleted;
    std::string anchor;       // where to go on
    bool moreComing = false;  // then at once
};

// A connection to the service. Movable; one thread at a time, but for `watch`, which other threads'
// calls do not wait for.
class Service {
  public:
    // Where `marrowdale serve` has its socket when it is not told otherwise: $MARROWDALE_STATE,
    // else $XDG_STATE_HOME/marrowdale, else ~/.local/state/marrowdale; empty without a HOME.
    [[nodiscard]] static std::string defaultStateFolder();
    [[nodiscard]] static Result<Service> connect(
        const std::string& stateFolder = defaultStateFolder());

    Service(Service&& other) noexcept;
    Service& operator=(Service&& other) noexcept;
    ~Service();

    [[nodiscard]] Result<Item> item(std::string_view identifier);
    // `path` is absolute.
    [[nodiscard]] Result<std::string> identifierAt(std::string_view path);
    [[nodiscard]] Result<std::string> pathOf(std::string_view identifier);

    // A page of a folder; without `page` the first.
    [[nodiscard]] Result<Page> page(std::string_view container,
                                    const std::optional<std::string>& page = std::nullopt);

    // From where changes can be followed. The working set's tell of every item in the served trees,
    // the root's and a folder's of what is directly in it.
    [[nodiscard]] Result<std::string> anchor(std::string_view container);
    // "syncAnchorExpired" when what happened since then is not known any more: list again.
    [[nodiscard]] Result<Changes> changes(std::string_view container, std::string_view since);

    // Tells of every container that is to be asked for changes, until the stop is asked for (which
    // is success) or the service ends. `ready` is called once, when nothing that happens later will
    // be missed.
    [[nodiscard]] Result<void> watch(const std::vector<std::string>& containers,
                                     const std::function<void()>& ready,
                                     const std::function<void(std::string_view container)>& signal,
                                     std::stop_token stop);

    // Items whose name or a tag contains every word.
    [[nodiscard]] Result<std::vector<Item>> search(const std::vector<std::string>& words);

    // The document libraries of applications, which also stand in the root.
    [[nodiscard]] Result<std::vector<Item>> applications();
    // The library of one application, listed or not. "invalidParameter" where there is none.
    [[nodiscard]] Result<Item> application(std::string_view bundleIdentifier);
    // Looks at the applications of the system again, and returns when what was installed before
    // the call is known. A service does so by itself a moment after something changed.
    [[nodiscard]] Result<void> refreshApplications();
    // A picture of the item as PNG, in the size that suits the screen: an application's library
    // has its icon. None for other items.
    [[nodiscard]] Result<std::optional<std::string>> thumbnail(std::string_view identifier);

  private:
    class Connection;
    explicit Service(std::unique_ptr<Connection> connection);
    std::unique_ptr<Connection> connection_;
};

}  // namespace marrowdale::client
