#include "host/daemon/ApiMessages.h"

#include "platform/foundation/PercentEncoding.h"

namespace marrowdale::host {

namespace {

// Calls `take` with each piece between separators; false as soon as it answers false.
template <typename Take>
bool forEachPiece(std::string_view text, char separator, const Take& take) {
    while (true) {
        const std::size_t end = text.find(separator);
        if (!take(text.substr(0, end))) {
            return false;
        }
        if (end == std::string_view::npos) {
            return true;
        }
        text.remove_prefix(end + 1);
    }
}

bool takeParameter(std::string_view piece, ApiRequest& request) {
    if (piece.empty()) {
        return true;
    }
    const std::size_t equals = piece.find('=');
    auto name = percentDecoded(piece.substr(0, equals));
    auto value = percentDecoded(equals == std::string_view::npos ? "" : piece.substr(equals + 1));
    if (!name || !value) {
        return false;
    }
    request.query.emplace_back(std::move(*name), std::move(*value));
    return true;
}

}  // namespace

std::optional<ApiRequest> ApiRequest::fromTarget(std::string_view method, std::string_view target) {
    if (!target.starts_with('/')) {
        return std::nullopt;
    }
    ApiRequest request;
    request.method = method;
    const std::size_t mark = target.find('?');
    const bool isPath = forEachPiece(target.substr(1, mark - 1), '/', [&](std::string_view piece) {
        auto segment = percentDecoded(piece);
        if (segment) {
            request.path.push_back(std::move(*segment));
        }
        return segment.has_value();
    });
    const std::string_view query = mark == std::string_view::npos ? "" : target.substr(mark + 1);
    const bool isQuery = forEachPiece(
        query, '&', [&](std::string_view piece) { return takeParameter(piece, request); });
    return isPath && isQuery ? std::optional(std::move(request)) : std::nullopt;
}

std::optional<std::string> ApiRequest::parameter(std::string_view name) const {
    for (const auto& [key, value] : query) {
        if (key == name) {
            return value;
        }
    }
    return std::nullopt;
}

std::vector<std::string> ApiRequest::parameters(std::string_view name) const {
    std::vector<std::string> values;
    for (const auto& [key, value] : query) {
        if (key == name) {
            values.push_back(value);
        }
    }
    return values;
}

}  // namespace marrowdale::host
