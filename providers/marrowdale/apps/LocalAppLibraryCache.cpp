#include "providers/marrowdale/apps/LocalAppLibraryCache.h"

#include <limits>
#include <optional>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/foundation/KeyedArchive.h"
#include "providers/marrowdale/items/FileSystemAccess.h"

namespace marrowdale {

namespace {

constexpr std::string_view folderName = "Marrowdale";
constexpr std::string_view versionTokenKey = "versionToken";
constexpr std::string_view bundleProxyKey = "bundleProxy";
constexpr std::size_t shownComponents = 4;

bool isMain(LocalAppLibraryCacheSource source) {
    return source == LocalAppLibraryCacheSource::main;
}

std::string queueLabel(LocalAppLibraryCacheSource source) {
    return std::string("marrowdale.app-library-cache.") + (isMain(source) ? "main" : "working-set");
}

URL urlOfCache(const Platform& platform, LocalAppLibraryCacheSource source) {
    const auto directories = platform.applicationSupport.applicationSupportDirectories();
    if (directories.empty()) {
        fatalError("the user has no application support directory");
    }
    return directories.front()
        .appendingPathComponent(folderName)
        .appendingPathComponent(isMain(source) ? "app-libraries.plist"
                                               : "searchable-app-libraries.plist");
}

bool isNoSuchFile(const Error& error) {
    return error.domain == ErrorDomain::file &&
           error.code == static_cast<int>(FileErrorCode::noSuchFile);
}

std::optional<std::uint64_t> unsignedEntry(const ArchivedDictionary& entries) {
    const auto entry = entries.find(versionTokenKey);
    const auto* number = entry == entries.end() ? nullptr : entry->second.as<Number>();
    return number ? unsignedValue(*number) : std::nullopt;
}

// None when there is no such entry, or it is anything but an array of bundle records.
std::optional<std::vector<ArchivedBundleRecord>> recordsEntry(const ArchivedDictionary& entries) {
    const auto entry = entries.find(bundleProxyKey);
    const auto* array = entry == entries.end() ? nullptr : entry->second.as<ArchivedArray>();
    if (!array) {
        return std::nullopt;
    }
    std::vector<ArchivedBundleRecord> records;
    for (const ArchivedObject& object : *array) {
        const auto* record = object.as<ArchivedBundleRecord>();
        if (!record) {
            return std::nullopt;
        }
        records.push_back(*record);
    }
    return records;
}

// Bytes that are no archive of a dictionary count as one that lacks everything.
ArchivedDictionary entriesIn(const Data& data) {
    const auto root = unarchive(data.bytes());
    const auto* entries = root ? root->as<ArchivedDictionary>() : nullptr;
    return entries ? *entries : ArchivedDictionary();
}

}  // namespace

std::string_view description(LocalAppLibraryCacheSource source) {
    return isMain(source) ? "main cache" : "working-set cache";
}

LocalAppLibraryCache::LocalAppLibraryCache(const Platform& platform,
                                           LocalAppLibraryCacheSource source)
    : platform_(platform),
      source_(source),
      queue_(queueLabel(source)),
      cacheURL_(urlOfCache(platform, source)) {}

LocalAppLibraryCache& LocalAppLibraryCache::of(const Platform& platform,
                                               LocalAppLibraryCacheSource source) {
    return platform.shared.get<LocalAppLibraryCache>(queueLabel(source), [&] {
        return std::make_shared<LocalAppLibraryCache>(platform, source);
    });
}

BundleRecords LocalAppLibraryCache::load() {
    assertOnQueue();
    const auto data = platform_.applicationSupport.read(cacheURL_);
    if (!data && isNoSuchFile(data.error())) {
        platform_.log.debug([] { return "nothing cached on disk"; });
        return reset();
    }
    if (!data) {
        platform_.log.error("can't load cache from disk let's reset; " +
                            data.error().description());
        return reset();
    }
    platform_.log.debug([&] {
        return "read from disk " + std::to_string(data->size()) + " bytes at " + shortPath();
    });
    return recordsInData(*data);
}

BundleRecords LocalAppLibraryCache::recordsInData(const Data& data) {
    const ArchivedDictionary entries = entriesIn(data);
    const auto token = unsignedEntry(entries);
    if (!token) {
        platform_.log.debug(
            [] { return "version token invalid; data on disk is corrupted let's reset"; });
        return reset();
    }
    const auto archivedRecords = recordsEntry(entries);
    if (!archivedRecords) {
        platform_.log.debug(
            [] { return "bundle proxies invalid; data on disk is corrupted let's reset"; });
        return reset();
    }
    BundleRecords records;
    for (const ArchivedBundleRecord& record : *archivedRecords) {
        records.push_back(platform_.applications.unarchivedRecord(record));
    }
    platform_.log.debug([&] {
        return "loaded " + std::to_string(records.size()) + " app library items from data";
    });
    versionToken_ = *token;
    platform_.log.debug([&] {
        return "version token was set to " + std::to_string(versionToken_) + " after load";
    });
    return records;
}

BundleRecords LocalAppLibraryCache::reset() {
    versionToken_ = 0;
    return {};
}

Expected<std::uint64_t> LocalAppLibraryCache::save(const BundleRecords& records,
                                                   std::uint64_t versionToken, Bump bump) {
    assertOnQueue();
    const LogSection section(platform_.log,
                             [&] { return "saving bundle proxies to " + shortPath(); });
    // Where this fails, the write says why.
    (void)platform_.applicationSupport.createDirectory(cacheURL_.deletingLastPathComponent());
    if (bump == Bump::yes) {
        if (versionToken_ == std::numeric_limits<std::uint64_t>::max()) {
            fatalError("no version token is left for the " + std::string(description()));
        }
        versionToken = versionToken_ + 1;
    }
    ArchivedArray array;
    for (const auto& record : records) {
        array.emplace_back(archived(*record));
    }
    const auto data = archive(
        ArchivedDictionary{{std::string(versionTokenKey), ArchivedObject(Number(versionToken))},
                           {std::string(bundleProxyKey), ArchivedObject(std::move(array))}});
    if (!data) {
        return Unexpected(data.error());
    }
    if (auto written = platform_.applicationSupport.replace(cacheURL_, *data); !written) {
        return Unexpected(written.error());
    }
    platform_.log.debug([&] {
        return "wrote on disk " + std::to_string(data->size()) + " bytes at " + shortPath();
    });
    versionToken_ = versionToken;
    return versionToken;
}

std::uint64_t LocalAppLibraryCache::versionToken() const {
    assertOnQueue();
    return versionToken_;
}

std::string LocalAppLibraryCache::shortPath() const {
    auto components = cacheURL_.pathComponents();
    components.erase(components.begin());  // the "/"
    const std::size_t first =
        components.size() > shownComponents ? components.size() - shownComponents : 0;
    std::string path = "~";
    for (std::size_t i = first; i < components.size(); ++i) {
        path.append("/").append(components[i]);
    }
    return path;
}

void LocalAppLibraryCache::assertOnQueue() const {
    if (!queue_.isCurrent()) {
        fatalError("the " + std::string(description()) + " is used outside of its queue");
    }
}

}  // namespace marrowdale
