#pragma once

#include <memory>
#include <string_view>

#include "platform/Platform.h"
#include "platform/testing/EmptyFileSystem.h"
#include "platform/testing/FakeApplicationRegistry.h"
#include "platform/testing/FakeApplicationSupport.h"
#include "platform/testing/FakeDeviceInformation.h"
#include "platform/testing/FakeExtendedAttributes.h"
#include "platform/testing/FakeFileEventService.h"
#include "platform/testing/FakeImageServices.h"
#include "platform/testing/FakeManager.h"
#include "platform/testing/FaultInjectingFileOperations.h"
#include "platform/testing/FaultInjectingFileSystem.h"
#include "platform/testing/RecordingLogSink.h"
#include "platform/testing/RefusingFileOperations.h"
#include "platform/testing/ScriptedGenerationStore.h"

namespace marrowdale {

// A whole platform without a disk, every part of which a test can make answer as it likes.
struct FakePlatform {
    explicit FakePlatform(std::string_view storageRoot = "/storage") : manager(storageRoot) {}

    std::shared_ptr<RecordingLogSink> sink = std::make_shared<RecordingLogSink>();
    Log log{sink, LogLevel::debug};
    EmptyFileSystem emptyFileSystem;
    FaultInjectingFileSystem fileSystem{emptyFileSystem};
    FakeExtendedAttributes attributes;
    FakeWriteAccess writeAccess;
    RefusingFileOperations noFileOperations;
    FaultInjectingFileOperations fileOperations{noFileOperations};
    ScriptedGenerationStore store;
    FakeFileEventService events;
    FakeApplicationRegistry applications;
    FakeManager manager;
    FakeApplicationSupport applicationSupport;
    FakeDeviceInformation device;
    FakeIconService icons;
    FakeImageEncoder imageEncoder;
    SharedObjects shared;
    Platform platform{log,    fileSystem,   attributes, writeAccess, fileOperations,     store,
                      events, applications, manager,    shared,      applicationSupport, device,
                      icons,  imageEncoder};
};

}  // namespace marrowdale
