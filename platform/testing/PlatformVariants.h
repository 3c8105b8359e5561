#pragma once

#include "platform/Platform.h"

namespace marrowdale {

// A platform with another service in one place, for tests that script that one alone.

[[nodiscard]] inline Platform withFileSystem(const Platform& from, FileSystem& fileSystem) {
    return {.log = from.log,
            .fileSystem = fileSystem,
            .extendedAttributes = from.extendedAttributes,
            .writeAccess = from.writeAccess,
            .fileOperations = from.fileOperations,
            .generationStore = from.generationStore,
            .fileEvents = from.fileEvents,
            .applications = from.applications,
            .manager = from.manager,
            .shared = from.shared,
            .applicationSupport = from.applicationSupport,
            .deviceInformation = from.deviceInformation,
            .icons = from.icons,
            .imageEncoder = from.imageEncoder};
}

[[nodiscard]] inline Platform withGenerationStore(const Platform& from, GenerationStore& store) {
    return {.log = from.log,
            .fileSystem = from.fileSystem,
            .extendedAttributes = from.extendedAttributes,
            .writeAccess = from.writeAccess,
            .fileOperations = from.fileOperations,
            .generationStore = store,
            .fileEvents = from.fileEvents,
            .applications = from.applications,
            .manager = from.manager,
            .shared = from.shared,
            .applicationSupport = from.applicationSupport,
            .deviceInformation = from.deviceInformation,
            .icons = from.icons,
            .imageEncoder = from.imageEncoder};
}

[[nodiscard]] inline Platform withFileEvents(const Platform& from, FileEventService& fileEvents) {
    return {.log = from.log,
            .fileSystem = from.fileSystem,
            .extendedAttributes = from.extendedAttributes,
            .writeAccess = from.writeAccess,
            .fileOperations = from.fileOperations,
            .generationStore = from.generationStore,
            .fileEvents = fileEvents,
            .applications = from.applications,
            .manager = from.manager,
            .shared = from.shared,
            .applicationSupport = from.applicationSupport,
            .deviceInformation = from.deviceInformation,
            .icons = from.icons,
            .imageEncoder = from.imageEncoder};
}

[[nodiscard]] inline Platform withFileOperations(const Platform& from, FileOperations& service) {
    return {.log = from.log,
            .fileSystem = from.fileSystem,
            .extendedAttributes = from.extendedAttributes,
            .writeAccess = from.writeAccess,
            .fileOperations = service,
            .generationStore = from.generationStore,
            .fileEvents = from.fileEvents,
            .applications = from.applications,
            .manager = from.manager,
            .shared = from.shared,
            .applicationSupport = from.applicationSupport,
            .deviceInformation = from.deviceInformation,
            .icons = from.icons,
            .imageEncoder = from.imageEncoder};
}

[[nodiscard]] inline Platform withExtendedAttributes(const Platform& from,
                                                     ExtendedAttributes& service) {
    return {.log = from.log,
            .fileSystem = from.fileSystem,
            .extendedAttributes = service,
            .writeAccess = from.writeAccess,
            .fileOperations = from.fileOperations,
            .generationStore = from.generationStore,
            .fileEvents = from.fileEvents,
            .applications = from.applications,
            .manager = from.manager,
            .shared = from.shared,
            .applicationSupport = from.applicationSupport,
            .deviceInformation = from.deviceInformation,
            .icons = from.icons,
            .imageEncoder = from.imageEncoder};
}

}  // namespace marrowdale
