#pragma once

#include <array>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderItem.h"
#include "providers/marrowdale/items/ItemMetadata.h"

namespace marrowdale {

class LocalAppLibraryItem;
class ParentFolderCache;

// The record of a file or folder that the provider serves. Everything is read when it is made;
// afterwards it is a snapshot. The fields are those of its base.
class LocalItem : public FileProviderItem {
  public:
    using FileProviderItem::FileProviderItem;

    // Names of the extended attributes; see ItemMetadata.h for what they hold.
    static constexpr std::string_view xattrLastUsedDateName = lastUsedDateAttribute;
    static constexpr std::string_view xattrTagDataName = tagDataAttribute;
    static constexpr std::string_view xattrFavoriteRankName = favoriteRankAttribute;
    static constexpr std::string_view xattrTrashDateName = trashDateAttribute;
    static constexpr std::string_view xattrTrashPutBackName = trashPutBackAttribute;

    // What a listing of a folder brings along for the items' sake, in this order.
    static constexpr std::array urlKeys = {
        ResourceKey::parentDirectoryURL,      ResourceKey::name,       ResourceKey::localizedName,
        ResourceKey::typeIdentifier,          ResourceKey::fileSize,   ResourceKey::creationDate,
        ResourceKey::contentModificationDate, ResourceKey::isReadable, ResourceKey::isWritable};
    // Those, and the ones that identifiers are made of: a listing gives out the document
    // identifiers of a whole page at once.
    [[nodiscard]] static ResourceKeySet listingKeys();
    // The extended attributes that items are made of.
    [[nodiscard]] static const std::vector<std::string>& listingAttributes();

    // What may be given instead of being read from the URL.
    struct Options {
        std::optional<std::string> customItemID;
        std::optional<std::string> customParentItemID;
        std::optional<std::string> customFilename;
        // Whether to look up the app library that holds the item, for the two bundle identifiers.
        bool hasLumenoDomainIdentifier = false;
        // Known beforehand, so that there is nothing to look up.
        std::optional<std::string> bundleIdentifier;
    };

    // Null, after one line in the log, when the URL's item can't be served: it has no identifier,
    // parent, filename, type or status, or is the "Inbox" folder at the top of a library.
    // `parents` may be null; with it, the items of one folder share what they have in common.
    [[nodiscard]] static std::shared_ptr<LocalItem> initWithURL(
        const Platform& platform, const URL& url, const Options& options,
        ParentFolderCache* parents = nullptr);
    [[nodiscard]] static std::shared_ptr<LocalItem> initWithURL(const Platform& platform,
                                                                const URL& url) {
        return initWithURL(platform, url, Options{});
    }
    // The item of an identifier string of any kind; null when there is none.
    [[nodiscard]] static std::shared_ptr<LocalItem> initWithFileIdentifier(
        const Platform& platform, std::string_view identifier);

    // The folder that a trashed item goes back to: looked up at first use (see PutBack.h) and kept.
    // Not for several threads at once.
    [[nodiscard]] std::optional<URL> putBackURL(const Platform& platform);
    void setPutBackURL(std::optional<URL> url) { putBackURL_ = std::move(url); }
    // The item of the app library that holds this one; null when none does, and for the item of an
    // app library itself.
    [[nodiscard]] std::shared_ptr<LocalAppLibraryItem> fetchAppLibraryItem(
        const Platform& platform) const;

    [[nodiscard]] const std::string& itemIdentifierAsString() const { return itemIdentifier; }
    [[nodiscard]] const std::string& parentItemIdentifierAsString() const {
        return parentItemIdentifier;
    }

    [[nodiscard]] bool hx_isContainer() const override { return false; }
    [[nodiscard]] bool isFolder() const override;
    // <CLASS:ADDRESS ID name:"NAME" parent:PARENT type:TYPE trashed favorite:RANK>
    [[nodiscard]] std::string description() const override;

  protected:
    // Reads everything; false when the item can't be served. Called once.
    [[nodiscard]] bool initialise(const Platform& platform, const Options& options,
                                  ParentFolderCache* parents);
    [[nodiscard]] virtual std::string_view className() const { return "LocalItem"; }

  private:
    [[nodiscard]] bool readIdentity(const Platform& platform, const Options& options,
                                    ParentFolderCache* parents);
    [[nodiscard]] bool readParent(const Platform& platform, const Options& options,
                                  ParentFolderCache* parents);
    [[nodiscard]] bool readNameAndType(const Platform& platform, const Options& options);
    [[nodiscard]] bool isTopLevelInbox() const;
    void readDatesAndSize(const Platform& platform);
    [[nodiscard]] std::uint64_t readCapabilities(const Platform& platform) const;
    void readMetadata(const Platform& platform);
    [[nodiscard]] bool readStatus(const Platform& platform);
    void readDocID();
    void readBundleIdentifier(const Platform& platform, const Options& options,
                              ParentFolderCache* parents);
    [[nodiscard]] bool isRoot() const;
    [[nodiscard]] bool isAppLibrary() const { return itemIdentifier.starts_with('#'); }

    // Outer no value: not looked up yet.
    std::optional<std::optional<URL>> putBackURL_;
};

// Whether, among the components of the path, ".Trash" directly follows "Documents".
[[nodiscard]] bool isTrashedPath(std::string_view path);

}  // namespace marrowdale
