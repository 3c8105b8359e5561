#include "host/cli/ThumbnailCommand.h"

#include <CLI/App.hpp>
#include <fmt/format.h>

#include "host/cli/ThumbnailFile.h"
#include "host/daemon/ReadableSize.h"
#include "host/requests/HarmlessText.h"
#include "host/requests/JsonWriter.h"

namespace marrowdale::host {

namespace {

// `path`: none where there was nothing to write.
std::string jsonLine(const Thumbnail& thumbnail, const std::optional<std::string>& path) {
    JsonWriter writer;
    writer.beginObject().key("itemIdentifier").string(thumbnail.itemIdentifier).key("bytes");
    if (path) {
        writer.number(std::uint64_t{thumbnail.data->size()}).key("path").string(*path);
    } else {
        writer.null().key("path").null();
    }
    writer.endObject();
    return writer.take();
}

std::string peoplesLine(const Thumbnail& thumbnail, const std::optional<std::string>& path) {
    const std::string identifier = harmlessName(thumbnail.itemIdentifier);
    return path ? fmt::format("{}  {}  {}", identifier, readableSize(thumbnail.data->size()),
                              harmlessName(*path))
                : identifier + "  no thumbnail";
}

}  // namespace

void ThumbnailCommand::declareArguments(CLI::App& arguments) {
    arguments.add_option("ITEM", items_, "A path, a word, or an identifier")
        ->required()
        ->expected(1, -1);
    arguments.add_option("--out", folder_, "Where to write IDENTIFIER.png, made when missing")
        ->type_name("DIR")
        ->capture_default_str()
        ->take_last();
}

Outcome ThumbnailCommand::run(CommandContext& context) {
    if (folder_.empty()) {
        return std::unexpected(Failure::commandLine("--out wants a folder"));
    }
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    std::vector<std::string> identifiers;
    for (const std::string& item : items_) {
        auto resolved = context.resolve(ItemArgument(item));
        if (!resolved) {
            return std::unexpected(resolved.error());
        }
        identifiers.push_back(std::move(resolved->identifier));
    }
    const auto thumbnails = (*requests)->thumbnails(identifiers);
    if (!thumbnails) {
        return std::unexpected(Failure::provider(thumbnails.error()));
    }
    const Environment& environment = context.environment();
    const std::string folder =
        folder_ == "." ? environment.workingFolder() : environment.absolutePath(folder_);
    for (const Thumbnail& thumbnail : *thumbnails) {
        std::optional<std::string> path;
        if (thumbnail.data) {
            auto written = writeThumbnail(folder, thumbnail.itemIdentifier, *thumbnail.data);
            if (!written) {
                return std::unexpected(Failure::provider(written.error()));
            }
            path = std::move(*written);
        }
        context.output().writeLine(context.json() ? jsonLine(thumbnail, path)
                                                  : peoplesLine(thumbnail, path));
    }
    return {};
}

}  // namespace marrowdale::host
