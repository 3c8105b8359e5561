#pragma once

#include <chrono>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "host/daemon/LocalRequests.h"
#include "host/daemon/Settings.h"
#include "host/daemon/StartFailure.h"
#include "platform/foundation/Log.h"
#include "platform/linux/store/Retention.h"
#include "platform/linux/store/StoreOptions.h"

namespace marrowdale::host {

struct WorldOptions {
    Settings settings;
    std::shared_ptr<LogSink> logSink;  // null: nothing is logged
    LogLevel logThreshold = LogLevel::error;
    std::string modulePath;
    // The program that draws icons; where it is missing, applications have a plain one.
    std::string iconProgramPath = {};
    // The value of an environment variable; none when it is unset or empty. Any thread.
    std::function<std::optional<std::string>(std::string_view name)> variable =
        [](std::string_view) { return std::nullopt; };
    // How much history is kept.
    native::Retention retention = {};
    // Whether what happens is recorded as it happens.
    native::StoreOptions::Recording recording = native::StoreOptions::Recording::once;
    // How long to wait for another process that has the state folder.
    std::chrono::milliseconds lockWait = std::chrono::minutes(1);
    // How much of that passes before people are told; and how they are told, with one line of text
    // (null: not at all), on the thread that opens the world.
    std::chrono::milliseconds quietWait = std::chrono::seconds(1);
    std::function<void(const std::string& line)> tellWaiting = nullptr;
    // Asked while another process has the state folder, whenever something changes in it: true
    // ends the waiting (the error is EALREADY).
    std::function<bool()> isServed = nullptr;
};

// The composition root: makes everything a provider runs on (log, store, file services, registry of
// applications, manager), loads the extension's module and hands it the platform. The only place
// where implementations are chosen. Several worlds may live in one process, each with a state
// folder of its own.
//
// Threads: the requests may be made from any.
class World {
  public:
    // Opens the store first, which brings the index up to what is on disk. Fails when the state
    // folder is held by another process or can't be written, when the root can't be read, or when
    // the module can't be loaded.
    [[nodiscard]] static Started<std::unique_ptr<World>> open(const WorldOptions& options);

    // Takes everything down in the reverse order; the store is committed.
    ~World();
    World(const World&) = delete;
    World& operator=(const World&) = delete;

    // Good as long as the world.
    [[nodiscard]] LocalRequests& requests() const;
    [[nodiscard]] const Settings& settings() const;
    [[nodiscard]] Log& log() const;

  private:
    struct ApplicationSide;
    class Parts;
    explicit World(std::unique_ptr<Parts> parts);
    std::unique_ptr<Parts> parts_;
};

}  // namespace marrowdale::host
