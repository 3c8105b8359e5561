#include "host/browser/Secrets.h"

#include <array>
#include <cerrno>
#include <glib.h>
#include <memory>
#include <sys/random.h>

#include "platform/foundation/FatalError.h"

namespace marrowdale::host {

std::string newSecret() {
    constexpr std::size_t size = 32;
    std::array<unsigned char, size> bytes{};
    ssize_t count = -1;
    do {
        count = ::getrandom(bytes.data(), bytes.size(), 0);
    } while (count < 0 && errno == EINTR);
    if (count != static_cast<ssize_t>(size)) {
        fatalError("the kernel gives no random bytes");
    }
    constexpr std::string_view digits = "0123456789abcdef";
    std::string text;
    for (const unsigned char byte : bytes) {
        text += digits[byte / digits.size()];
        text += digits[byte % digits.size()];
    }
    return text;
}

std::string signatureOf(std::string_view key, std::string_view text) {
    const std::basic_string<guchar> keyBytes(key.begin(), key.end());
    const std::unique_ptr<char, void (*)(void*)> signature(
        g_compute_hmac_for_string(G_CHECKSUM_SHA256, keyBytes.data(), keyBytes.size(), text.data(),
                                  static_cast<gssize>(text.size())),
        g_free);
    return signature.get();
}

bool areSameSecret(std::string_view a, std::string_view b) {
    if (a.size() != b.size()) {
        return false;
    }
    unsigned difference = 0;
    for (std::size_t i = 0; i < a.size(); ++i) {
        difference |= static_cast<unsigned>(static_cast<unsigned char>(a[i]) ^
                                            static_cast<unsigned char>(b[i]));
    }
    return difference == 0;
}

}  // namespace marrowdale::host
