#pragma once

#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/foundation/Log.h"
#include "platform/linux/applications/ApplicationPlaces.h"
#include "platform/linux/applications/DataContainers.h"
#include "platform/services/ApplicationRegistry.h"

namespace marrowdale::native {

struct LinuxApplicationRegistryOptions {
    ApplicationPlaces places;
    std::string storageRoot;  // without links
    // May be null. Must outlive the registry.
    Log* log = nullptr;
    // The icon of that name (none: a generic one) for a variant, in the icon service's form. Null:
    // nobody has icons. Any thread.
    std::function<std::optional<Data>(const std::optional<std::string>& icon, int variant)> icons;
    // Told which documents folders there are whenever they are others than before (another folder
    // at the same path is another one), before anybody else can learn of them; one call at a time,
    // on the thread of whoever reads the registry, which waits for it. Null: nobody wants to know.
    std::function<void(const std::vector<std::string>& paths)> documentFoldersChanged;
};

// The applications of this system, from their desktop entries. An enumeration of the user's
// applications reads the folders anew, but for files that are as they were; one of the system's
// tells what was read last, so both together are one picture. What a record is asked is answered
// from its file as it is then, but by the block that it is handed to: there as it was read. Any
// thread.
//
// A record outlives the registry's changes, not the registry.
class LinuxApplicationRegistry final : public ApplicationRegistry {
  public:
    explicit LinuxApplicationRegistry(LinuxApplicationRegistryOptions options);
    ~LinuxApplicationRegistry() override;

    void enumerateApplications(ApplicationKind kind, const RecordBlock& block) override;
    std::shared_ptr<const BundleRecord> proxyFor(const URL& url,
                                                 URLRelationship relationship) override;
    std::shared_ptr<const BundleRecord> bundleRecordForIdentifier(
        std::string_view bundleIdentifier) override;
    std::shared_ptr<const BundleRecord> unarchivedRecord(
        const ArchivedBundleRecord& record) override;
    std::optional<PropertyListDictionary> infoValuesForKeys(
        const BundleRecord& record, std::span<const std::string_view> keys) override;

    // The documents folders of the applications that want theirs served, sorted. No others: one
    // that comes to be served is new then, with all that is in it. Reads the registry anew.
    [[nodiscard]] std::vector<std::string> documentFolders();
    // What applications declare as the extensions of packages, sorted. Reads the registry anew.
    [[nodiscard]] std::vector<std::string> packageExtensions();
    // The same as of the last reading.
    [[nodiscard]] std::vector<std::string> knownPackageExtensions();

    // An application whose documents can't be served, and why.
    struct Refused {
        std::string identifier;
        DataContainers::Refusal refusal = DataContainers::Refusal::missing;
        friend bool operator==(const Refused&, const Refused&) = default;
    };
    // Those whose documents folder is there; as of the last reading.
    [[nodiscard]] std::vector<Refused> refusedLibraries() const;

    [[nodiscard]] const ApplicationPlaces& places() const { return options_.places; }

  private:
    class Record;
    struct Scan;
    struct Reader;
    [[nodiscard]] std::shared_ptr<const Scan> rescan();
    [[nodiscard]] std::shared_ptr<const Scan> scan();
    using DocumentsFolder = std::pair<std::string, FileID>;  // where, and which
    void tell(const Scan& scan);
    void tellRefusals(const Scan& scan);
    [[nodiscard]] std::shared_ptr<const BundleRecord> record(std::string identifier);

    const LinuxApplicationRegistryOptions options_;
    // Reads and tells in turn, so that what is told last is what was read last.
    std::mutex scanning_;
    std::unique_ptr<Reader> reader_;  // guarded by itself
    mutable std::mutex mutex_;
    std::shared_ptr<const Scan> scan_;                  // guarded by mutex_
    std::optional<std::vector<DocumentsFolder>> told_;  // guarded by scanning_
    std::set<std::string> refusalsTold_;                // guarded by scanning_
};

}  // namespace marrowdale::native
