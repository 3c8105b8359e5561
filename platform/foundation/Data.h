#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace marrowdale {

using Bytes = std::vector<std::uint8_t>;

// An immutable run of bytes. Copies share the bytes; usable from any thread.
class Data {
  public:
    Data() = default;
    // Takes the bytes over, without a copy.
    explicit Data(Bytes bytes) {
        const auto kept = std::make_shared<const Bytes>(std::move(bytes));
        bytes_ = std::shared_ptr<const std::uint8_t>(kept, kept->data());
        size_ = kept->size();
    }
    // Copies the bytes into one allocation.
    static Data copyOf(std::span<const std::uint8_t> bytes) {
        const auto kept = std::make_shared_for_overwrite<std::uint8_t[]>(  // NOLINT(*-c-arrays)
            bytes.size());
        std::ranges::copy(bytes, kept.get());
        Data data;
        data.bytes_ = std::shared_ptr<const std::uint8_t>(kept, kept.get());
        data.size_ = bytes.size();
        return data;
    }
    static Data fromText(std::string_view text) { return Data(Bytes(text.begin(), text.end())); }

    [[nodiscard]] std::span<const std::uint8_t> bytes() const { return {bytes_.get(), size_}; }
    [[nodiscard]] std::size_t size() const { return size_; }
    [[nodiscard]] bool empty() const { return size() == 0; }
    [[nodiscard]] std::string text() const { return std::string(bytes().begin(), bytes().end()); }

    friend bool operator==(const Data& a, const Data& b) {
        const auto left = a.bytes();
        const auto right = b.bytes();
        return std::equal(left.begin(), left.end(), right.begin(), right.end());
    }

  private:
    std::shared_ptr<const std::uint8_t> bytes_;  // the first; owns them all
    std::size_t size_ = 0;
};

}  // namespace marrowdale
