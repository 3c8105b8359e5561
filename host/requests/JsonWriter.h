#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace marrowdale::host {

// Writes one JSON value as text, on one line, as it is told of its parts. Written here because
// names are bytes: a byte that is no UTF-8 becomes the escape \udcXX (XX the byte), which libraries
// refuse to write and most readers take. The caller keeps the order: a key before each value of an
// object, ends that match. One thread.
class JsonWriter {
  public:
    JsonWriter& beginObject();
    JsonWriter& endObject();
    JsonWriter& beginArray();
    JsonWriter& endArray();
    JsonWriter& key(std::string_view name);

    JsonWriter& string(std::string_view text);
    // In full, above 2^53 too.
    JsonWriter& number(std::uint64_t value);
    JsonWriter& number(std::int64_t value);
    // The shortest text that reads back as the same number. Must be finite.
    JsonWriter& number(double value);
    JsonWriter& boolean(bool value);
    JsonWriter& null();

    // The text so far; the writer begins anew.
    [[nodiscard]] std::string take();

  private:
    void separate();

    std::string text_;
    bool needsComma_ = false;
};

// Text as a JSON string, in its quotes.
void appendJsonString(std::string& out, std::string_view text);

}  // namespace marrowdale::host
