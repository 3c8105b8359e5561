#include "host/requests/ErrorJson.h"

#include <array>
#include <cerrno>

#include <nlohmann/json.hpp>

#include "host/requests/ErrorDescription.h"
#include "host/requests/ItemJson.h"
#include "host/requests/JsonReading.h"
#include "host/requests/ReceivedItem.h"
#include "platform/hostframework/FileProviderConstants.h"

namespace marrowdale::host {

namespace {

std::optional<ErrorDomain> domainOfName(std::string_view name) {
    constexpr std::array domains{ErrorDomain::posix, ErrorDomain::file, ErrorDomain::fileProvider,
                                 ErrorDomain::provider};
    for (const ErrorDomain domain : domains) {
        if (Error{domain, 0, {}, {}}.domainName() == name) {
            return domain;
        }
    }
    return std::nullopt;
}

std::optional<int> codeOf(const nlohmann::json& error) {
    const auto number = numberMember(error, "code");
    const auto* const code = number ? std::get_if<std::int64_t>(&*number) : nullptr;
    return code != nullptr && std::in_range<int>(*code) ? std::optional(static_cast<int>(*code))
                                                        : std::nullopt;
}

}  // namespace

void appendError(JsonWriter& writer, const Error& error) {
    const ErrorDescription description = described(error);
    writer.beginObject();
    writer.key("domain").string(description.domain);
    writer.key("code").number(std::int64_t{description.code});
    writer.key("name").string(description.name).key("message").string(description.message);
    for (const auto& [key, value] : description.details) {
        writer.key(key).string(value);
    }
    if (description.item) {
        writer.key("item");
        appendItem(writer, *description.item);
    }
    writer.key("operation").string(error.operation).key("subject").string(error.subject);
    writer.endObject();
}

std::string errorJson(const Error& error) {
    JsonWriter writer;
    writer.beginObject().key("error");
    appendError(writer, error);
    writer.endObject();
    return writer.take();
}

Error errorFromJson(std::string_view text) {
    const auto value = parsedJson(text);
    if (!value || !value->is_object() || !value->contains("error")) {
        return errorWithPOSIXCode(EPROTO, "understand the answer of the service", {});
    }
    const nlohmann::json& object = (*value)["error"];
    const auto domain = domainOfName(textMember(object, "domain").value_or(""));
    const auto code = codeOf(object);
    if (!domain || !code) {
        return errorWithPOSIXCode(EPROTO, "understand the answer of the service", {});
    }
    Error error{*domain, *code, textMember(object, "operation").value_or(""),
                textMember(object, "subject").value_or("")};
    if (object.contains("item")) {
        if (auto item = ReceivedItem::fromJson(object["item"])) {
            error.userInfo = std::make_shared<CollidingItemInfo>(std::move(item));
        }
    }
    return error;
}

}  // namespace marrowdale::host
