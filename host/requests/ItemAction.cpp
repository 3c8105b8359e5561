#include "host/requests/ItemAction.h"

#include <array>
#include <utility>
#include <variant>

#include <nlohmann/json.hpp>

#include "host/requests/JsonReading.h"
#include "host/requests/JsonWriter.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

using Kind = ItemAction::Kind;
constexpr std::array<std::pair<std::string_view, Kind>, 11> kinds{{{"import", Kind::import},
                                                                   {"create", Kind::create},
                                                                   {"rename", Kind::rename},
                                                                   {"move", Kind::move},
                                                                   {"trash", Kind::trash},
                                                                   {"untrash", Kind::untrash},
                                                                   {"delete", Kind::remove},
                                                                   {"tag", Kind::tag},
                                                                   {"favorite", Kind::favorite},
                                                                   {"used", Kind::used},
                                                                   {"purge", Kind::purge}}};

std::string_view nameOf(Kind kind) {
    for (const auto& [name, known] : kinds) {
        if (known == kind) {
            return name;
        }
    }
    return {};
}

std::optional<Kind> kindOf(const std::optional<std::string>& text) {
    for (const auto& [name, kind] : kinds) {
        if (text == name) {
            return kind;
        }
    }
    return std::nullopt;
}

std::optional<std::vector<std::string>> tagsOf(const nlohmann::json& object) {
    std::vector<std::string> tags;
    const auto* array = arrayMember(object, "tags");
    if (array == nullptr) {
        return tags;
    }
    for (const nlohmann::json& value : *array) {
        auto tag = bytes(value);
        if (!tag) {
            return std::nullopt;
        }
        tags.push_back(std::move(*tag));
    }
    return tags;
}

// The member that the action can't do without, and does not have; empty when it has all.
std::string_view missingMember(const ItemAction& action) {
    const bool needsItem =
        action.kind != Kind::import && action.kind != Kind::create && action.kind != Kind::purge;
    if (needsItem && action.item.empty()) {
        return "item";
    }
    const bool needsParent =
        action.kind == Kind::import || action.kind == Kind::create || action.kind == Kind::move;
    if (needsParent && !action.parent) {
        return "parent";
    }
    if ((action.kind == Kind::create || action.kind == Kind::rename) && !action.name) {
        return "name";
    }
    if (action.kind == Kind::import && !action.path.starts_with('/')) {
        return "path";
    }
    return action.kind == Kind::purge && !action.date ? "date" : "";
}

}  // namespace

std::string actionJson(const ItemAction& action) {
    JsonWriter writer;
    writer.beginObject().key("action").string(nameOf(action.kind));
    if (!action.item.empty()) {
        writer.key("item").string(action.item);
    }
    if (action.parent) {
        writer.key("parent").string(*action.parent);
    }
    if (action.name) {
        writer.key("name").string(*action.name);
    }
    if (!action.path.empty()) {
        writer.key("path").string(action.path);
    }
    if (!action.tags.empty()) {
        writer.key("tags").beginArray();
        for (const std::string& tag : action.tags) {
            writer.string(tag);
        }
        writer.endArray();
    }
    if (action.rank) {
        writer.key("rank");
        std::visit([&](auto value) { writer.number(value); }, *action.rank);
    }
    if (action.date) {
        writer.key("date").string(action.date->rfc3339());
    }
    return writer.endObject().take();
}

Expected<ItemAction> actionFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    const auto kind = object ? kindOf(textMember(*object, "action")) : std::nullopt;
    if (!kind) {
        return Unexpected(errorInvalidParameter("action", text.substr(0, 100)));
    }
    auto tags = tagsOf(*object);
    if (!tags) {
        return Unexpected(errorInvalidParameter("tags", ""));
    }
    ItemAction action;
    action.kind = *kind;
    action.item = textMember(*object, "item").value_or("");
    action.parent = textMember(*object, "parent");
    action.name = textMember(*object, "name");
    action.path = textMember(*object, "path").value_or("");
    action.tags = std::move(*tags);
    action.rank = numberMember(*object, "rank");
    action.date = dateMember(*object, "date");
    const auto missing = missingMember(action);
    return missing.empty() ? Expected<ItemAction>(std::move(action))
                           : Unexpected(errorInvalidParameter(missing, ""));
}

std::string progressJson(const ActionProgress& progress) {
    JsonWriter writer;
    writer.beginObject().key("entries").number(progress.entries);
    writer.key("bytes").number(progress.bytes);
    writer.key("totalBytes").number(progress.totalBytes);
    return writer.endObject().take();
}

std::optional<ActionProgress> progressFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    const auto entries = object ? unsignedMember(*object, "entries") : std::nullopt;
    if (!entries) {
        return std::nullopt;
    }
    return ActionProgress{*entries, unsignedMember(*object, "bytes").value_or(0),
                          unsignedMember(*object, "totalBytes").value_or(0)};
}

}  // namespace marrowdale::host
