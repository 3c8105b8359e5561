#include "host/requests/ReceivedItem.h"

#include <nlohmann/json.hpp>

#include "host/requests/JsonReading.h"
#include "host/requests/TagNames.h"

namespace marrowdale::host {

namespace {

std::optional<Data> tagDataOf(const nlohmann::json& object) {
    const nlohmann::json* const tags = arrayMember(object, "tags");
    if (tags == nullptr) {
        return std::nullopt;
    }
    std::vector<std::string> names;
    for (const nlohmann::json& tag : *tags) {
        if (auto name = bytes(tag)) {
            names.push_back(std::move(*name));
        }
    }
    return tagDataFor(names);
}

}  // namespace

std::shared_ptr<const ReceivedItem> ReceivedItem::fromJson(const nlohmann::json& object) {
    auto identifier = textMember(object, "itemIdentifier");
    auto filename = textMember(object, "filename");
    const auto path = textMember(object, "path");
    if (!identifier || !filename || !path) {
        return nullptr;
    }
    const std::shared_ptr<ReceivedItem> item(new ReceivedItem(URL::fileURL(*path)));
    item->itemIdentifier = std::move(*identifier);
    item->filename = std::move(*filename);
    item->parentItemIdentifier = textMember(object, "parentItemIdentifier").value_or("");
    item->typeIdentifier = textMember(object, "typeIdentifier").value_or("");
    item->documentSize = unsignedMember(object, "documentSize");
    item->creationDate = dateMember(object, "creationDate");
    item->contentModificationDate = dateMember(object, "contentModificationDate");
    item->childItemCount = unsignedMember(object, "childItemCount");
    item->capabilities = unsignedMember(object, "capabilities").value_or(0);
    item->versionIdentifier = dataMember(object, "versionIdentifier");
    item->isTrashed = booleanMember(object, "isTrashed").value_or(false);
    item->lastUsedDate = dateMember(object, "lastUsedDate");
    item->tagData = tagDataOf(object);
    item->favoriteRank = numberMember(object, "favoriteRank");
    item->fileID = unsignedMember(object, "fileID");
    item->docID = unsignedMember(object, "docID");
    item->hx_appContainerBundleIdentifier = textMember(object, "appContainerBundleIdentifier");
    item->hx_lumenoDomainIdentifier = item->hx_appContainerBundleIdentifier;
    item->isContainer_ = booleanMember(object, "isContainer").value_or(false);
    item->isFolder_ = booleanMember(object, "isFolder").value_or(false);
    return item;
}

std::string ReceivedItem::description() const {
    return "<ReceivedItem " + itemIdentifier + " name:\"" + filename + "\">";
}

}  // namespace marrowdale::host
