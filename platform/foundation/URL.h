#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/ResourceValue.h"

namespace marrowdale {

// A place: a file URL made of an absolute path, or some other URL that is only carried. Paths are
// bytes, never assumed to be UTF-8; they appear percent-encoded in `absoluteString`.
//
// Copies share one body, and with it the resource values cached on it: a value set on one copy is
// seen by the others. A URL made anew for the same path starts with no values.
//
// Threads: a URL may be read, and values cached on it, from several threads.
class URL {
  public:
    // A file URL. `path` is made absolute by putting "/" in front if need be; repeated and trailing
    // slashes go; "." and ".." stay (see standardized()).
    [[nodiscard]] static URL fileURL(std::string_view path);

    // Reads an absolute URL ("file:///tmp/a%20b", "https://example.org"). No value when it has no
    // scheme, a bad percent escape, or a NUL in the path.
    [[nodiscard]] static std::optional<URL> fromAbsoluteString(std::string_view text);

    // The child `name` (one component, no "/") of `parent`, with values that a listing learnt. The
    // child keeps the parent, so deletingLastPathComponent() gives that very object and its values.
    [[nodiscard]] static URL listedChild(const URL& parent, std::string_view name,
                                         PrefetchedValues values);

    [[nodiscard]] bool isFileURL() const;
    // The path's bytes, decoded; empty for a URL that is no file URL.
    [[nodiscard]] const std::string& path() const;
    // "/" for the root folder.
    [[nodiscard]] std::string_view lastPathComponent() const;
    // "/" first where the path is absolute, then each component.
    [[nodiscard]] std::vector<std::string_view> pathComponents() const;
    [[nodiscard]] std::string absoluteString() const;

    [[nodiscard]] URL deletingLastPathComponent() const;
    // Appends one or several components, separated by "/".
    [[nodiscard]] URL appendingPathComponent(std::string_view component) const;
    // "." and ".." taken out by name alone; the disk is not asked.
    [[nodiscard]] URL standardized() const;

    // A value cached on this URL (by a listing or by setCachedResourceValue). Outer no value:
    // nothing is cached for the key; a cached monostate: the resource is known to have no value.
    [[nodiscard]] std::optional<ResourceValue> cachedResourceValue(ResourceKey key) const;
    // Caches a value on the URL object only; nothing is written to disk. False when the key can't
    // be cached (parentDirectoryURL, which is derived).
    bool setCachedResourceValue(ResourceKey key, ResourceValue value) const;
    // Forgets every cached value, what a listing learnt included, for this URL object alone.
    [[nodiscard]] URL withoutCachedValues() const;

    // Fast paths of cachedResourceValue for what a listing learnt; null when not made by a listing.
    [[nodiscard]] const PrefetchedValues* prefetched() const;

    // Same scheme and same path bytes.
    friend bool operator==(const URL& a, const URL& b);

  private:
    struct Body;
    explicit URL(std::shared_ptr<const Body> body) : body_(std::move(body)) {}
    std::shared_ptr<const Body> body_;
};

// How two places lie to each other, decided on names alone (standardised paths).
enum class URLRelationship : int { contains = 0, same = 1, other = 2 };

// `contains` when `item` lies below `container`, at any depth.
[[nodiscard]] URLRelationship relationship(const URL& container, const URL& item);

}  // namespace marrowdale
