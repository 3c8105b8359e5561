#include "host/requests/ItemJson.h"

#include <cmath>
#include <optional>

#include "host/requests/TagNames.h"
#include "platform/foundation/Base64.h"

namespace marrowdale::host {

namespace {

// Writes fields of the object that is open, those that have a value.
class Fields {
  public:
    explicit Fields(JsonWriter& writer) : writer_(writer) {}

    void text(std::string_view name, std::string_view value) { writer_.key(name).string(value); }
    void optionalText(std::string_view name, const std::optional<std::string>& value) {
        if (value) {
            text(name, *value);
        }
    }
    void number(std::string_view name, const std::optional<std::uint64_t>& value) {
        if (value) {
            writer_.key(name).number(*value);
        }
    }
    void date(std::string_view name, const std::optional<Date>& value) {
        if (value && isWithinRFC3339(*value)) {
            text(name, value->rfc3339());
        }
    }
    void boolean(std::string_view name, bool value) { writer_.key(name).boolean(value); }

  private:
    JsonWriter& writer_;
};

void appendNumber(JsonWriter& writer, std::string_view name, const Number& number) {
    // JSON has no text for these; the field then has no value.
    if (const double* real = std::get_if<double>(&number); real && !std::isfinite(*real)) {
        return;
    }
    writer.key(name);
    std::visit([&](auto value) { writer.number(value); }, number);
}

void appendTags(JsonWriter& writer, const FileProviderItem& item) {
    writer.key("tags").beginArray();
    for (const std::string& tag : tagNames(item)) {
        writer.string(tag);
    }
    writer.endArray();
}

void appendIdentity(Fields& fields, const FileProviderItem& item) {
    fields.text("itemIdentifier", item.itemIdentifier);
    fields.text("parentItemIdentifier", item.parentItemIdentifier);
    fields.text("filename", item.filename);
    fields.text("typeIdentifier", item.typeIdentifier);
}

void appendState(Fields& fields, const FileProviderItem& item) {
    fields.number("documentSize", item.documentSize);
    fields.date("creationDate", item.creationDate);
    fields.date("contentModificationDate", item.contentModificationDate);
    fields.number("childItemCount", item.childItemCount);
    fields.number("capabilities", item.capabilities);
    if (item.versionIdentifier) {
        fields.text("versionIdentifier", base64Encoded(item.versionIdentifier->bytes()));
    }
    fields.boolean("isTrashed", item.isTrashed);
    fields.date("lastUsedDate", item.lastUsedDate);
}

void appendPlace(Fields& fields, const FileProviderItem& item) {
    fields.number("fileID", item.fileID);
    fields.number("docID", item.docID);
    fields.text("path", item.fileURL.path());
    fields.boolean("isFolder", item.isFolder());
    fields.boolean("isContainer", item.hx_isContainer());
    fields.optionalText("appContainerBundleIdentifier", item.hx_appContainerBundleIdentifier);
}

}  // namespace

bool isWithinRFC3339(const Date& date) {
    constexpr std::int64_t yearZero = -62'167'219'200;
    constexpr std::int64_t yearTenThousand = 253'402'300'800;
    return date.seconds >= yearZero && date.seconds < yearTenThousand;
}

void appendItem(JsonWriter& writer, const FileProviderItem& item) {
    writer.beginObject();
    Fields fields(writer);
    appendIdentity(fields, item);
    appendState(fields, item);
    if (item.tagData) {
        appendTags(writer, item);
    }
    if (item.favoriteRank) {
        appendNumber(writer, "favoriteRank", *item.favoriteRank);
    }
    appendPlace(fields, item);
    writer.endObject();
}

}  // namespace marrowdale::host
