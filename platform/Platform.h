#pragma once

#include "platform/SharedObjects.h"
#include "platform/foundation/Log.h"
#include "platform/hostframework/FileProviderManager.h"
#include "platform/services/ApplicationRegistry.h"
#include "platform/services/ApplicationSupport.h"
#include "platform/services/DeviceInformation.h"
#include "platform/services/ExtendedAttributes.h"
#include "platform/services/FileEventService.h"
#include "platform/services/FileOperations.h"
#include "platform/services/FileSystem.h"
#include "platform/services/GenerationStore.h"
#include "platform/services/IconService.h"
#include "platform/services/ImageEncoder.h"

namespace marrowdale {

// Everything that the extension may ask of the system it runs on, and the owner of what exists once
// in a world. References: whoever makes the Platform keeps all of it alive for longer than the
// extension. Two worlds can live side by side in a process.
struct Platform {
    Log& log;
    FileSystem& fileSystem;
    ExtendedAttributes& extendedAttributes;
    WriteAccess& writeAccess;
    FileOperations& fileOperations;
    GenerationStore& generationStore;
    FileEventService& fileEvents;
    ApplicationRegistry& applications;
    FileProviderManager& manager;
    SharedObjects& shared;
    ApplicationSupport& applicationSupport;
    DeviceInformation& deviceInformation;
    IconService& icons;
    ImageEncoder& imageEncoder;
};

}  // namespace marrowdale
