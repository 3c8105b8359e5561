#include "tests/support/ItemComparison.h"

#include <optional>
#include <sstream>

namespace marrowdale {

namespace {

std::string text(const std::string& value) {
    return value;
}
std::string text(std::uint64_t value) {
    return std::to_string(value);
}
std::string text(const Date& value) {
    return value.rfc3339();
}
std::string text(const Number& value) {
    return std::visit(
        [&](auto number) { return std::to_string(value.index()) + ":" + std::to_string(number); },
        value);
}
std::string text(const Data& value) {
    std::ostringstream out;
    for (const std::uint8_t byte : value.bytes()) {
        out << std::hex << static_cast<int>(byte) << ' ';
    }
    return out.str();
}
template <typename T>
std::string text(const std::optional<T>& value) {
    return value ? text(*value) : "none";
}

}  // namespace

std::string allFields(const FileProviderItem& item) {
    std::string fields;
    const auto add = [&](const char* name, const std::string& value) {
        fields += std::string(name) + ": " + value + "\n";
    };
    add("itemIdentifier", item.itemIdentifier);
    add("parentItemIdentifier", item.parentItemIdentifier);
    add("filename", item.filename);
    add("typeIdentifier", item.typeIdentifier);
    add("documentSize", text(item.documentSize));
    add("creationDate", text(item.creationDate));
    add("contentModificationDate", text(item.contentModificationDate));
    add("childItemCount", text(item.childItemCount));
    add("capabilities", text(item.capabilities));
    add("versionIdentifier", text(item.versionIdentifier));
    add("isTrashed", item.isTrashed ? "yes" : "no");
    add("lastUsedDate", text(item.lastUsedDate));
    add("tagData", text(item.tagData));
    add("favoriteRank", text(item.favoriteRank));
    add("fileID", text(item.fileID));
    add("docID", text(item.docID));
    add("path", item.fileURL.path());
    add("hx_lumenoDomainIdentifier", text(item.hx_lumenoDomainIdentifier));
    add("hx_appContainerBundleIdentifier", text(item.hx_appContainerBundleIdentifier));
    add("hx_isUbiquitous", item.hx_isUbiquitous ? "yes" : "no");
    add("hx_isContainer", item.hx_isContainer() ? "yes" : "no");
    add("isFolder", item.isFolder() ? "yes" : "no");
    return fields;
}

}  // namespace marrowdale
