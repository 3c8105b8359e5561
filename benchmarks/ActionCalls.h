#pragma once

#include <future>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

#include "benchmarks/World.h"
#include "platform/hostframework/FileProviderActions.h"

namespace marrowdale::benchmarks {

// Makes a request that is answered with an item, and waits for that. Throws what came instead.
template <typename Call>
FileProviderItemPtr itemOf(const Call& call) {
    std::promise<Expected<FileProviderItemPtr>> answer;
    call(ItemCompletionHandler(
        [&](Expected<FileProviderItemPtr> item) { answer.set_value(std::move(item)); }));
    auto item = answer.get_future().get();
    if (!item) {
        throw std::runtime_error(item.error().description());
    }
    return std::move(*item);
}

// The identifier of what stands there. Throws where nothing does.
[[nodiscard]] inline std::string identifierAt(World& world, const std::string& path) {
    auto identifier = world.provider().persistentIdentifierForItemAtURL(URL::fileURL(path));
    if (!identifier) {
        throw std::runtime_error("no identifier for " + path);
    }
    return std::move(*identifier);
}

inline void importInto(World& world, const std::string& source, const std::string& parent) {
    static_cast<void>(itemOf([&](auto handler) {
        world.provider().importDocumentAtURL(URL::fileURL(source), parent, handler);
    }));
}

inline void deleteItem(World& world, const std::string& item) {
    std::promise<std::optional<Error>> answer;
    world.provider().deleteItemWithIdentifier(
        item, [&](const std::optional<Error>& error) { answer.set_value(error); });
    if (const auto error = answer.get_future().get()) {
        throw std::runtime_error(error->description());
    }
}

}  // namespace marrowdale::benchmarks
