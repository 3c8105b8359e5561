#pragma once

#include <cstddef>
#include <string>
#include <string_view>

namespace marrowdale::host {

// The character that text begins with, as UTF-8 has it.
struct LeadingCharacter {
    char32_t codePoint = 0;
    std::size_t length = 0;  // bytes; 0 where the text is empty or does not begin with UTF-8
};
[[nodiscard]] LeadingCharacter leadingCharacter(std::string_view text);

// Whether the text can be shown as it is: UTF-8 without control characters, line or paragraph
// separators, and marks that turn the direction of what is around them.
[[nodiscard]] bool isHarmless(std::string_view text);

// The text with every byte that is not harmless written as an escape: \n, \t, \r, \e, \\ and \xHH.
// A backslash is doubled, so two texts never look the same. One line, whatever the bytes are.
[[nodiscard]] std::string escaped(std::string_view text);

// For a line that people read: the text where it is harmless, else its escaped form, in which a
// backslash that was there stays single.
[[nodiscard]] std::string harmlessLine(std::string_view text);

// A name for people: itself where it is harmless, else quoted as shells with $'…' read it, so that
// it can be pasted.
[[nodiscard]] std::string harmlessName(std::string_view name);

}  // namespace marrowdale::host
