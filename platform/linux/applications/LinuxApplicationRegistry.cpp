#include "platform/linux/applications/LinuxApplicationRegistry.h"

#include <algorithm>
#include <utility>

#include "platform/linux/applications/DesktopEntryFolders.h"

namespace marrowdale::native {

namespace {

constexpr std::string_view documentsName = "Documents";

using Refusal = DataContainers::Refusal;

std::string_view words(Refusal refusal) {
    switch (refusal) {
        case Refusal::otherVolume:
            return "they lie on another volume than the storage root";
        case Refusal::unreadable:
            return "they can't be read";
        case Refusal::overlapping:
            return "the storage root is among them, or they are in it";
        case Refusal::none:
        case Refusal::missing:
            break;
    }
    return "there are none";
}

// Whether the provider serves the documents of such an application.
bool isServed(const DesktopEntry& entry) {
    return entry.says("KvSupportsDocumentBrowser") ||
           (entry.says("KvSupportsOpenInPlace") && entry.says("KvFileSharingEnabled"));
}

}  // namespace

// What one reading of all folders found.
struct LinuxApplicationRegistry::Scan {
    DesktopEntryFolders::Entries entries;
    DataContainers containers;
    std::vector<DocumentsFolder> documentFolders;
    std::vector<std::string> packageExtensions;
    std::vector<Refused> refused;

    [[nodiscard]] std::vector<std::string> documentPaths() const {
        std::vector<std::string> paths;
        for (const auto& [path, folder] : documentFolders) {
            paths.push_back(path);
        }
        return paths;
    }
};

// The reader of files, which remembers them, for one thread at a time.
struct LinuxApplicationRegistry::Reader {
    std::mutex mutex;
    DesktopEntryFolders folders;  // guarded by mutex

    DesktopEntryFolders::Entries read(const std::vector<ApplicationFolder>& places) {
        const std::lock_guard lock(mutex);
        return folders.read(places);
    }
    DesktopEntryFolders::Look look(const std::string& path) {
        const std::lock_guard lock(mutex);
        return folders.look(path);
    }
};

// Names an application; what it says is looked up when it is asked.
class LinuxApplicationRegistry::Record final : public BundleRecord {
  public:
    Record(LinuxApplicationRegistry& registry, std::string identifier)
        : registry_(registry), identifier_(std::move(identifier)) {}

    std::optional<std::string> bundleIdentifier() const override {
        return identifier_.empty() ? std::nullopt : std::optional(identifier_);
    }
    std::optional<std::string> localizedName() const override {
        const auto found = entry();
        return found ? found->name : std::nullopt;
    }
    std::optional<URL> dataContainerURL() const override {
        if (!isInstalled()) {
            return std::nullopt;
        }
        const auto container = registry_.scan()->containers.containerOf(identifier_);
        return container.refusal == Refusal::none ? std::optional(URL::fileURL(container.path))
                                                  : std::nullopt;
    }
    bool supportsOpenInPlace() const override {
        const auto found = entry();
        return found && found->says("KvSupportsOpenInPlace");
    }
    bool fileSharingEnabled() const override {
        const auto found = entry();
        return found && found->says("KvFileSharingEnabled");
    }
    bool isApplication() const override { return true; }
    std::optional<Data> iconDataForVariant(int variant) const override {
        if (!registry_.options_.icons) {
            return std::nullopt;
        }
        const auto found = entry();
        return registry_.options_.icons(found ? found->icon : std::nullopt, variant);
    }

    // Null for an application that is gone, and one whose entry can't be read.
    [[nodiscard]] std::shared_ptr<const DesktopEntry> entry() const {
        std::shared_ptr<const DesktopEntry> found;
        (void)lookUp(found);
        return found;
    }
    [[nodiscard]] bool isInstalled() const {
        std::shared_ptr<const DesktopEntry> found;
        return lookUp(found);
    }

  private:
    // The file that was found last, as it is now; when it is gone, whatever takes its place.
    bool lookUp(std::shared_ptr<const DesktopEntry>& found) const {
        if (lookUpIn(*registry_.scan(), found)) {
            return true;
        }
        return lookUpIn(*registry_.rescan(), found);
    }
    bool lookUpIn(const Scan& scan, std::shared_ptr<const DesktopEntry>& found) const {
        const auto named = scan.entries.find(identifier_);
        if (named == scan.entries.end()) {
            return false;
        }
        auto look = registry_.reader_->look(named->second.path);
        const bool isThere = look.presence == DesktopEntryFolders::Presence::present &&
                             (!look.entry || (look.entry->isApplication && !look.entry->isHidden));
        found = isThere ? std::move(look.entry) : nullptr;
        return isThere;
    }

    LinuxApplicationRegistry& registry_;
    const std::string identifier_;
};

LinuxApplicationRegistry::LinuxApplicationRegistry(LinuxApplicationRegistryOptions options)
    : options_(std::move(options)),
      reader_(new Reader{{}, DesktopEntryFolders(options_.places.locale)}) {}

LinuxApplicationRegistry::~LinuxApplicationRegistry() = default;

std::shared_ptr<const LinuxApplicationRegistry::Scan> LinuxApplicationRegistry::rescan() {
    const std::lock_guard turn(scanning_);
    auto scan = std::make_shared<Scan>(
        Scan{.entries = reader_->read(options_.places.folders),
             .containers = DataContainers(options_.places.containersFolder, options_.storageRoot),
             .documentFolders = {},
             .packageExtensions = {},
             .refused = {}});
    for (const auto& [identifier, found] : scan->entries) {
        if (!found.entry || found.entry->info.empty()) {
            continue;
        }
        std::ranges::copy(found.entry->packageExtensions(),
                          std::back_inserter(scan->packageExtensions));
        if (!isServed(*found.entry)) {
            continue;
        }
        auto container = scan->containers.containerOf(identifier);
        if (container.refusal == Refusal::none) {
            scan->documentFolders.emplace_back(container.path + "/" + std::string(documentsName),
                                               container.documents);
        } else if (container.refusal != Refusal::missing) {
            scan->refused.push_back({identifier, container.refusal});
        }
    }
    std::ranges::sort(scan->documentFolders);
    std::ranges::sort(scan->packageExtensions);
    const auto repeated = std::ranges::unique(scan->packageExtensions);
    scan->packageExtensions.erase(repeated.begin(), repeated.end());
    tell(*scan);
    const std::lock_guard lock(mutex_);
    scan_ = scan;
    return scan;
}

void LinuxApplicationRegistry::tell(const Scan& scan) {
    tellRefusals(scan);
    if (options_.documentFoldersChanged && told_ != scan.documentFolders) {
        options_.documentFoldersChanged(scan.documentPaths());
    }
    told_ = scan.documentFolders;
}

void LinuxApplicationRegistry::tellRefusals(const Scan& scan) {
    std::set<std::string> now;
    for (const Refused& refused : scan.refused) {
        const std::string line = "can't serve the documents of " + refused.identifier + ": " +
                                 std::string(words(refused.refusal));
        if (options_.log && !refusalsTold_.contains(line)) {
            options_.log->error(line);
        }
        now.insert(line);
    }
    refusalsTold_ = std::move(now);
}

std::shared_ptr<const LinuxApplicationRegistry::Scan> LinuxApplicationRegistry::scan() {
    {
        const std::lock_guard lock(mutex_);
        if (scan_) {
            return scan_;
        }
    }
    return rescan();
}

std::shared_ptr<const BundleRecord> LinuxApplicationRegistry::record(std::string identifier) {
    return std::make_shared<const Record>(*this, std::move(identifier));
}

void LinuxApplicationRegistry::enumerateApplications(ApplicationKind kind,
                                                     const RecordBlock& block) {
    // Held: what the block asks a record may lead to another reading.
    const auto now = rescan();
    for (const auto& [identifier, found] : now->entries) {
        if (found.kind == kind) {
            block(record(identifier));
        }
    }
}

std::shared_ptr<const BundleRecord> LinuxApplicationRegistry::bundleRecordForIdentifier(
    std::string_view bundleIdentifier) {
    const auto found = std::make_shared<const Record>(*this, std::string(bundleIdentifier));
    return found->isInstalled() ? found : nullptr;
}

std::shared_ptr<const BundleRecord> LinuxApplicationRegistry::unarchivedRecord(
    const ArchivedBundleRecord& record) {
    return this->record(record.bundleIdentifier);
}

std::shared_ptr<const BundleRecord> LinuxApplicationRegistry::proxyFor(
    const URL& url, URLRelationship relationship) {
    const auto now = scan();
    if (relationship == URLRelationship::same) {
        const auto identifier = now->containers.identifierAt(url.standardized().path());
        auto found = identifier ? bundleRecordForIdentifier(*identifier) : nullptr;
        return found && found->dataContainerURL() ? found : nullptr;
    }
    for (const auto& [identifier, found] : now->entries) {
        auto candidate = record(identifier);
        const auto container = candidate->dataContainerURL();
        if (container && (marrowdale::relationship(*container, url) == relationship ||
                          marrowdale::relationship(container->appendingPathComponent(documentsName),
                                                   url) == relationship)) {
            return candidate;
        }
    }
    return nullptr;
}

std::optional<PropertyListDictionary> LinuxApplicationRegistry::infoValuesForKeys(
    const BundleRecord& record, std::span<const std::string_view> keys) {
    const auto* own = dynamic_cast<const Record*>(&record);
    const auto entry = own ? own->entry() : nullptr;
    if (!entry) {
        return std::nullopt;
    }
    PropertyListDictionary values;
    for (const std::string_view key : keys) {
        if (const auto value = entry->info.find(key); value != entry->info.end()) {
            values.insert(*value);
        }
    }
    return values;
}

std::vector<std::string> LinuxApplicationRegistry::documentFolders() {
    return rescan()->documentPaths();
}

std::vector<std::string> LinuxApplicationRegistry::packageExtensions() {
    return rescan()->packageExtensions;
}

std::vector<LinuxApplicationRegistry::Refused> LinuxApplicationRegistry::refusedLibraries() const {
    const std::lock_guard lock(mutex_);
    return scan_ ? scan_->refused : std::vector<Refused>();
}

}  // namespace marrowdale::native
