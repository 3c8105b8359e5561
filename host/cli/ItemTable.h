#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale::host {

// Items for people, a line each: identifier, type, size, when it was modified (local time), name.
// Columns are aligned within a page and never narrower than in the page before. One thread.
class ItemTable {
  public:
    enum class Colour : std::uint8_t { none, terminal };
    explicit ItemTable(Colour colour) : colour_(colour) {}

    // The lines of one page, each with its newline. Names are harmless, a folder's ends in "/".
    [[nodiscard]] std::string page(const std::vector<FileProviderItemPtr>& items);

  private:
    Colour colour_;
    std::size_t identifierWidth_ = 0;
    std::size_t typeWidth_ = 0;
    std::size_t sizeWidth_ = 1;
};

// Everything an item has, a line a field, names aligned; a field without a value is left out.
[[nodiscard]] std::string itemDetails(const FileProviderItem& item);

// "2026-01-31 23:59" in local time; words where the year is outside 0 to 9999.
[[nodiscard]] std::string readableTime(const Date& date);

}  // namespace marrowdale::host
