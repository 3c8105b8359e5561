#pragma once

#include "platform/Platform.h"

namespace marrowdale {

// A platform with another service in one place, for tests that script that one alone.

// The services that are to be others; null for those that stay.
struct OtherServices {
    FileSystem* fileSystem = nullptr;
    ExtendedAttributes* extendedAttributes = nullptr;
    FileOperations* fileOperations = nullptr;
    GenerationStore* generationStore = nullptr;
    FileEventService* fileEvents = nullptr;
    FileProviderManager* manager = nullptr;
    SharedObjects* shared = nullptr;
};

[[nodiscard]] inline Platform withServices(const Platform& from, const OtherServices& others) {
    const auto chosen = []<typename Service>(Service* other, Service& present) -> Service& {
        return other != nullptr ? *other : present;
    };
    return {.log = from.log,
            .fileSystem = chosen(others.fileSystem, from.fileSystem),
            .extendedAttributes = chosen(others.extendedAttributes, from.extendedAttributes),
            .writeAccess = from.writeAccess,
            .fileOperations = chosen(others.fileOperations, from.fileOperations),
            .generationStore = chosen(others.generationStore, from.generationStore),
            .fileEvents = chosen(others.fileEvents, from.fileEvents),
            .applications = from.applications,
            .manager = chosen(others.manager, from.manager),
            .shared = chosen(others.shared, from.shared),
            .applicationSupport = from.applicationSupport,
            .deviceInformation = from.deviceInformation,
            .icons = from.icons,
            .imageEncoder = from.imageEncoder};
}

[[nodiscard]] inline Platform withFileSystem(const Platform& from, FileSystem& service) {
    return withServices(from, {.fileSystem = &service});
}
[[nodiscard]] inline Platform withExtendedAttributes(const Platform& from,
                                                     ExtendedAttributes& service) {
    return withServices(from, {.extendedAttributes = &service});
}
[[nodiscard]] inline Platform withFileOperations(const Platform& from, FileOperations& service) {
    return withServices(from, {.fileOperations = &service});
}
[[nodiscard]] inline Platform withGenerationStore(const Platform& from, GenerationStore& service) {
    return withServices(from, {.generationStore = &service});
}
[[nodiscard]] inline Platform withFileEvents(const Platform& from, FileEventService& service) {
    return withServices(from, {.fileEvents = &service});
}

}  // namespace marrowdale
