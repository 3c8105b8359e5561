#include "host/requests/FeedJson.h"

#include <array>
#include <cerrno>

#include <nlohmann/json.hpp>

#include "host/requests/ItemJson.h"
#include "host/requests/JsonReading.h"
#include "host/requests/ReceivedItem.h"
#include "platform/foundation/Base64.h"

namespace marrowdale::host {

namespace {

Unexpected notUnderstood() {
    return Unexpected(errorWithPOSIXCode(EPROTO, "understand the answer of the service", {}));
}

void appendItems(JsonWriter& writer, const std::vector<FileProviderItemPtr>& items) {
    writer.beginArray();
    for (const auto& item : items) {
        appendItem(writer, *item);
    }
    writer.endArray();
}

void appendToken(JsonWriter& writer, const std::optional<Data>& token) {
    if (token) {
        writer.string(base64Encoded(token->bytes()));
    } else {
        writer.null();
    }
}

// The items of an array; none when one of them can't be read.
std::optional<std::vector<FileProviderItemPtr>> items(const nlohmann::json* array) {
    if (array == nullptr) {
        return std::nullopt;
    }
    std::vector<FileProviderItemPtr> items;
    items.reserve(array->size());
    for (const nlohmann::json& object : *array) {
        auto item = ReceivedItem::fromJson(object);
        if (!item) {
            return std::nullopt;
        }
        items.push_back(std::move(item));
    }
    return items;
}

std::optional<std::vector<std::string>> texts(const nlohmann::json* array) {
    if (array == nullptr) {
        return std::nullopt;
    }
    std::vector<std::string> texts;
    for (const nlohmann::json& value : *array) {
        auto text = bytes(value);
        if (!text) {
            return std::nullopt;
        }
        texts.push_back(std::move(*text));
    }
    return texts;
}

std::optional<FindingStatus> statusOfName(std::string_view name) {
    constexpr std::array all{FindingStatus::ok, FindingStatus::note, FindingStatus::problem};
    for (const FindingStatus status : all) {
        if (statusName(status) == name) {
            return status;
        }
    }
    return std::nullopt;
}

void appendFinding(JsonWriter& writer, const Finding& finding) {
    writer.beginObject().key("finding").string(finding.name);
    writer.key("status").string(statusName(finding.status));
    writer.key("message").string(finding.message);
    if (!finding.advice.empty()) {
        writer.key("advice").string(finding.advice);
    }
    writer.endObject();
}

}  // namespace

std::string pageJson(const ItemPage& page) {
    JsonWriter writer;
    writer.beginObject().key("items");
    appendItems(writer, page.items);
    writer.key("nextPage");
    appendToken(writer, page.nextPage);
    writer.endObject();
    return writer.take();
}

Expected<ItemPage> pageFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    if (!object) {
        return notUnderstood();
    }
    auto listed = items(arrayMember(*object, "items"));
    if (!listed) {
        return notUnderstood();
    }
    return ItemPage{std::move(*listed), dataMember(*object, "nextPage")};
}

std::string changesJson(const ItemChanges& changes) {
    JsonWriter writer;
    writer.beginObject().key("updated");
    appendItems(writer, changes.updated);
    writer.key("deleted").beginArray();
    for (const std::string& identifier : changes.deleted) {
        writer.string(identifier);
    }
    writer.endArray().key("anchor");
    appendToken(writer, changes.anchor);
    writer.key("moreComing").boolean(changes.moreComing == MoreComing::yes);
    writer.endObject();
    return writer.take();
}

Expected<ItemChanges> changesFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    if (!object) {
        return notUnderstood();
    }
    auto updated = items(arrayMember(*object, "updated"));
    auto deleted = texts(arrayMember(*object, "deleted"));
    auto anchor = dataMember(*object, "anchor");
    const auto moreComing = booleanMember(*object, "moreComing");
    if (!updated || !deleted || !anchor || !moreComing) {
        return notUnderstood();
    }
    return ItemChanges{std::move(*updated), std::move(*deleted), std::move(*anchor),
                       *moreComing ? MoreComing::yes : MoreComing::no};
}

std::string anchorJson(const std::optional<Data>& anchor) {
    JsonWriter writer;
    writer.beginObject().key("anchor");
    appendToken(writer, anchor);
    writer.endObject();
    return writer.take();
}

Expected<std::optional<Data>> anchorFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    if (!object || !object->is_object() || !object->contains("anchor")) {
        return notUnderstood();
    }
    return dataMember(*object, "anchor");
}

std::string itemJson(const FileProviderItem& item) {
    JsonWriter writer;
    appendItem(writer, item);
    return writer.take();
}

Expected<FileProviderItemPtr> itemFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    FileProviderItemPtr item = object ? ReceivedItem::fromJson(*object) : nullptr;
    if (!item) {
        return notUnderstood();
    }
    return item;
}

std::string textJson(std::string_view key, std::string_view text) {
    JsonWriter writer;
    writer.beginObject().key(key).string(text).endObject();
    return writer.take();
}

Expected<std::string> textFromJson(const char* key, std::string_view text) {
    const auto object = parsedJson(text);
    auto member = object ? textMember(*object, key) : std::nullopt;
    if (!member) {
        return notUnderstood();
    }
    return std::move(*member);
}

std::string serviceJson(std::string_view version, std::uint64_t processID) {
    JsonWriter writer;
    writer.beginObject().key("version").string(version).key("processID").number(processID);
    writer.endObject();
    return writer.take();
}

Expected<std::uint64_t> processIDFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    const auto number = object ? unsignedMember(*object, "processID") : std::nullopt;
    if (!number) {
        return notUnderstood();
    }
    return *number;
}

std::string findingJson(const Finding& finding) {
    JsonWriter writer;
    appendFinding(writer, finding);
    return writer.take();
}

std::string findingsJson(const std::vector<Finding>& findings) {
    JsonWriter writer;
    writer.beginObject().key("findings").beginArray();
    for (const Finding& finding : findings) {
        appendFinding(writer, finding);
    }
    writer.endArray().endObject();
    return writer.take();
}

Expected<std::vector<Finding>> findingsFromJson(std::string_view text) {
    const auto object = parsedJson(text);
    const nlohmann::json* const array = object ? arrayMember(*object, "findings") : nullptr;
    if (array == nullptr) {
        return notUnderstood();
    }
    std::vector<Finding> findings;
    for (const nlohmann::json& value : *array) {
        const auto name = textMember(value, "finding");
        const auto status = statusOfName(textMember(value, "status").value_or(""));
        const auto message = textMember(value, "message");
        if (!name || !status || !message) {
            return notUnderstood();
        }
        findings.push_back({*name, *status, *message, textMember(value, "advice").value_or("")});
    }
    return findings;
}

}  // namespace marrowdale::host
