// How the registry of applications becomes a new version of the main cache.

#include <array>
#include <variant>

#include "providers/marrowdale/apps/LocalAppLibraryManager.h"

namespace marrowdale {

namespace {

constexpr std::array<std::string_view, 1> infoKeys = {"KvSupportsDocumentBrowser"};

bool readsAsTrue(const PropertyList& value) {
    if (const auto* flag = value.as<bool>()) {
        return *flag;
    }
    const auto* number = value.as<std::int64_t>();
    return number && *number != 0;
}

// What is no application at all is told before this.
bool qualifies(const Platform& platform, const BundleRecord& record) {
    if (!record.dataContainerURL()) {
        return false;
    }
    const auto info = platform.applications.infoValuesForKeys(record, infoKeys);
    if (!info) {
        return false;
    }
    const auto value = info->find(infoKeys.front());
    if (value != info->end() && readsAsTrue(value->second)) {
        return true;
    }
    return record.supportsOpenInPlace() && record.fileSharingEnabled();
}

std::string descriptionOf(const BundleRecords& records) {
    std::string list;
    for (const auto& record : records) {
        list.append(list.empty() ? "" : ", ").append(description(*record));
    }
    return "[" + list + "]";
}

BundleRecords retrieveAppLibraries(const Platform& platform) {
    const LogSection section(platform.log, [] { return "retrieving app libraries from rostrum"; });
    BundleRecords records;
    const auto add = [&](std::shared_ptr<const BundleRecord> record) {
        if (!record || !record->isApplication()) {
            platform.log.error("enumerate Application provided nil proxy");
            return;
        }
        if (qualifies(platform, *record)) {
            platform.log.debug(
                [&] { return "add " + record->bundleIdentifier().value_or("<unknown>"); });
            records.push_back(std::move(record));
        }
    };
    platform.applications.enumerateApplications(ApplicationKind::user, add);
    platform.applications.enumerateApplications(ApplicationKind::system, add);
    platform.log.debug([&] { return "bundle proxies " + descriptionOf(records); });
    return records;
}

// Position by position; another order is another list.
bool areIdentical(const BundleRecords& some, const BundleRecords& others) {
    if (some.size() != others.size()) {
        return false;
    }
    for (std::size_t i = 0; i < some.size(); ++i) {
        if (some[i]->dataContainerURL() != others[i]->dataContainerURL()) {
            return false;
        }
    }
    return true;
}

}  // namespace

LocalAppLibraryManager::Changed LocalAppLibraryManager::refreshAppLibraries(
    const Platform& platform) {
    const LogSection section(platform.log, [] { return "refreshing app libraries"; });
    const BundleRecords found = retrieveAppLibraries(platform);
    LocalAppLibraryCache& cache =
        LocalAppLibraryCache::of(platform, LocalAppLibraryCacheSource::main);
    BundleRecords cached;
    cache.queue().sync([&] { cached = cache.load(); });
    if (areIdentical(found, cached)) {
        platform.log.debug([] { return "bundle proxies are identical to previous version"; });
        return Changed::no;
    }
    Expected<std::uint64_t> token = 0;
    cache.queue().sync(
        [&] { token = cache.save(found, cache.versionToken(), LocalAppLibraryCache::Bump::yes); });
    if (!token) {
        platform.log.error("can't refresh app libraries; " + token.error().description());
        return Changed::no;
    }
    platform.log.debug([&] { return "main cache version token is now " + std::to_string(*token); });
    return Changed::yes;
}

}  // namespace marrowdale
