#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

namespace marrowdale::native {

// The store's files hold the processor's own numbers, and the memory image of rows.
static_assert(std::endian::native == std::endian::little);

// Puts numbers and strings behind each other.
class ByteWriter {
  public:
    template <typename T>
        requires std::is_trivially_copyable_v<T>
    void put(const T& value) {
        append(std::as_bytes(std::span(&value, 1)));
    }
    void append(std::span<const std::byte> bytes) {
        bytes_.insert(bytes_.end(), bytes.begin(), bytes.end());
    }
    // Seven bits a byte, the lowest first; the top bit says that more follow.
    void putVarint(std::uint64_t value) {
        constexpr std::uint64_t more = 0x80;
        for (; value >= more; value >>= 7U) {
            put(static_cast<std::uint8_t>(value | more));
        }
        put(static_cast<std::uint8_t>(value));
    }
    // Without a length.
    void text(std::string_view text) { append(std::as_bytes(std::span(text))); }
    void textWithLength(std::string_view value) {
        put(static_cast<std::uint32_t>(value.size()));
        text(value);
    }
    // Overwrites what stands at `offset`.
    template <typename T>
        requires std::is_trivially_copyable_v<T>
    void putAt(std::size_t offset, const T& value) {
        std::memcpy(bytes_.data() + offset, &value, sizeof value);
    }
    void clear() { bytes_.clear(); }
    [[nodiscard]] std::size_t size() const { return bytes_.size(); }
    [[nodiscard]] std::span<const std::byte> bytes() const { return bytes_; }

  private:
    std::vector<std::byte> bytes_;
};

// Takes numbers and strings from bytes. Reading past the end gives zeros and empty strings and
// makes `ok` false for good.
class ByteReader {
  public:
    explicit ByteReader(std::span<const std::byte> bytes) : left_(bytes) {}

    template <typename T>
        requires std::is_trivially_copyable_v<T>
    [[nodiscard]] T take() {
        T value{};
        const auto part = takeBytes(sizeof value);
        if (!part.empty()) {
            std::memcpy(&value, part.data(), sizeof value);
        }
        return value;
    }
    // What `putVarint` put; `ok` is false when it does not end, or is no 64-bit number.
    [[nodiscard]] std::uint64_t takeVarint() {
        constexpr unsigned lastShift = 63;
        std::uint64_t value = 0;
        for (unsigned shift = 0; shift <= lastShift; shift += 7) {
            const auto byte = take<std::uint8_t>();
            if (!ok_ || (shift == lastShift && byte > 1)) {
                break;
            }
            value |= std::uint64_t{byte & 0x7FU} << shift;
            if ((byte & 0x80U) == 0) {
                return value;
            }
        }
        ok_ = false;
        left_ = {};
        return 0;
    }
    // Empty when there are fewer left.
    [[nodiscard]] std::span<const std::byte> takeBytes(std::size_t count) {
        if (count > left_.size()) {
            ok_ = false;
            left_ = {};
            return {};
        }
        const auto part = left_.first(count);
        left_ = left_.subspan(count);
        return part;
    }
    [[nodiscard]] std::string_view takeText(std::size_t count) {
        const auto part = takeBytes(count);
        return {reinterpret_cast<const char*>(part.data()), part.size()};
    }
    [[nodiscard]] std::string_view takeTextWithLength() { return takeText(take<std::uint32_t>()); }
    [[nodiscard]] std::string_view rest() { return takeText(left_.size()); }
    [[nodiscard]] bool ok() const { return ok_; }
    // Everything was there and nothing is left.
    [[nodiscard]] bool finished() const { return ok_ && left_.empty(); }
    [[nodiscard]] std::size_t left() const { return left_.size(); }

  private:
    std::span<const std::byte> left_;
    bool ok_ = true;
};

}  // namespace marrowdale::native
