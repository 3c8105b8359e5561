#pragma once

#include <string>
#include <string_view>

namespace marrowdale::host {

// 256 random bits of the kernel's, as 64 hexadecimal digits. A process that can't have them ends.
[[nodiscard]] std::string newSecret();

// HMAC-SHA-256 of a text, as 64 hexadecimal digits.
[[nodiscard]] std::string signatureOf(std::string_view key, std::string_view text);

// Whether the texts are the same, in a time that depends on their lengths alone.
[[nodiscard]] bool areSameSecret(std::string_view a, std::string_view b);

}  // namespace marrowdale::host
