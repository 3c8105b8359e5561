#include "host/daemon/Applications.h"

#include <utility>

#include "platform/linux/applications/ApplicationPlaces.h"

namespace marrowdale::host {

namespace {

using Refusal = native::DataContainers::Refusal;

constexpr std::string_view iconsFolder = "/icons";

std::string_view reason(Refusal refusal) {
    switch (refusal) {
        case Refusal::otherVolume:
            return "on another volume than the storage root";
        case Refusal::unreadable:
            return "not readable";
        case Refusal::overlapping:
            return "inside the storage root, or around it";
        case Refusal::none:
        case Refusal::missing:
            break;
    }
    return "not there";
}

}  // namespace

Applications::Applications(const ApplicationsOptions& options)
    : options_(options),
      registry_({.places = native::applicationPlacesFor(options.variable),
                 .storageRoot = options.storageRoot,
                 .log = options.log,
                 .icons = [this](const std::optional<std::string>& icon,
                                 int variant) { return icons().iconData(icon, variant); },
                 .documentFoldersChanged = options.documentFoldersChanged}) {}

Applications::~Applications() = default;

native::ApplicationIcons& Applications::icons() {
    std::call_once(iconsMade_, [this] {
        icons_ = std::make_unique<native::ApplicationIcons>(
            native::IconTheme::placesFor(options_.variable),
            native::IconRenderer(options_.iconProgramPath),
            native::IconCache(options_.cacheFolder.empty()
                                  ? std::string()
                                  : options_.cacheFolder + std::string(iconsFolder)));
    });
    return *icons_;
}

void Applications::forgetIcons() {
    icons().forget();
}

void Applications::watch(std::function<void()> changed) {
    auto watch =
        native::ApplicationWatch::start(registry_.places(), [this, changed = std::move(changed)] {
            forgetIcons();
            changed();
        });
    if (watch) {
        watch_ = std::move(*watch);
    } else if (options_.log) {
        options_.log->error("can't notice when applications come and go; " +
                            watch.error().description());
    }
}

std::vector<Finding> Applications::findings() {
    const auto extensions = registry_.packageExtensions();
    return {packageExtensionsFinding(extensions),
            refusedLibrariesFinding(registry_.refusedLibraries())};
}

Finding refusedLibrariesFinding(
    const std::vector<native::LinuxApplicationRegistry::Refused>& refused) {
    if (refused.empty()) {
        return {
            "refused-libraries", FindingStatus::ok, "no application's documents are left out", {}};
    }
    std::string list;
    for (const auto& each : refused) {
        list += (list.empty() ? "" : ", ") + each.identifier + " (" +
                std::string(reason(each.refusal)) + ")";
    }
    return {"refused-libraries", FindingStatus::note,
            "documents of these applications are left out: " + list,
            "An application's documents are its folder ~/.var/app/IDENTIFIER/Documents: a real "
            "folder that you can read, on the storage root's volume, outside of the root."};
}

Finding packageExtensionsFinding(const std::vector<std::string>& extensions) {
    if (extensions.empty()) {
        return {"package-extensions",
                FindingStatus::ok,
                "no application says that its folders are one document each",
                {}};
    }
    std::string list;
    for (const std::string& extension : extensions) {
        list += (list.empty() ? "." : ", .") + extension;
    }
    return {"package-extensions",
            FindingStatus::ok,
            "folders whose names end so are one document, as applications say: " + list,
            {}};
}

}  // namespace marrowdale::host
