#include "host/browser/SignedAddresses.h"

#include <charconv>

#include "platform/foundation/PercentEncoding.h"

namespace marrowdale::host {

namespace {

std::string_view nameOf(SignedPlace::View view) {
    return view == SignedPlace::View::content ? "content" : "download";
}

std::optional<SignedPlace::View> viewNamed(std::string_view name) {
    for (const auto view : {SignedPlace::View::content, SignedPlace::View::download}) {
        if (nameOf(view) == name) {
            return view;
        }
    }
    return std::nullopt;
}

std::optional<std::int64_t> numberIn(std::string_view text) {
    std::int64_t number = 0;
    const auto parsed = std::from_chars(text.data(), text.data() + text.size(), number);
    return parsed.ec == std::errc() && parsed.ptr == text.data() + text.size()
               ? std::optional(number)
               : std::nullopt;
}

std::int64_t secondsOf(SignedAddresses::Clock::time_point time) {
    return std::chrono::duration_cast<std::chrono::seconds>(time.time_since_epoch()).count();
}

}  // namespace

// The parts are told apart by a character that none but the identifier may hold, which is the last.
std::string SignedAddresses::signature(const SignedPlace& place, std::string_view expiry) const {
    return signatureOf(key_, std::string(nameOf(place.view)) + "\n" + std::string(expiry) + "\n" +
                                 std::to_string(place.session) + "\n" + place.item);
}

std::string SignedAddresses::addressOf(const SignedPlace& place, std::string_view name) const {
    const std::string expiry = std::to_string(secondsOf(now_() + lifetime));
    return "/files/" + std::string(nameOf(place.view)) + "/" + percentEncodedPath(place.item) +
           (name.empty() ? "" : "/" + percentEncodedPath(name)) +
           "?session=" + std::to_string(place.session) + "&until=" + expiry +
           "&signature=" + signature(place, expiry);
}

std::optional<SignedPlace> SignedAddresses::placeAt(const ApiRequest& request) const {
    const std::size_t depth = request.path.size();
    if (depth < 3 || depth > 4 || request.path[0] != "files") {
        return std::nullopt;
    }
    const auto view = viewNamed(request.path[1]);
    const auto session = numberIn(request.parameter("session").value_or(""));
    const std::string expiry = request.parameter("until").value_or("");
    const auto until = numberIn(expiry);
    if (!view || !session || *session < 0 || !until || *until < secondsOf(now_())) {
        return std::nullopt;
    }
    SignedPlace place{*view, request.path[2], static_cast<std::uint64_t>(*session)};
    return areSameSecret(signature(place, expiry), request.parameter("signature").value_or(""))
               ? std::optional(std::move(place))
               : std::nullopt;
}

}  // namespace marrowdale::host
