#include "platform/foundation/URL.h"

#include <algorithm>
#include <atomic>
#include <map>
#include <utility>

#include "platform/foundation/Mutex.h"
#include "platform/foundation/PercentEncoding.h"

namespace marrowdale {

namespace {

constexpr std::string_view fileScheme = "file";

constexpr bool isLetter(char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}
constexpr bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

constexpr bool isSchemeCharacter(char c) {
    return isLetter(c) || isDigit(c) || c == '+' || c == '-' || c == '.';
}

constexpr bool equalsIgnoringCase(std::string_view a, std::string_view lowerCase) {
    return std::ranges::equal(a, lowerCase, {}, [](char c) {
        return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    });
}

constexpr bool isDotComponent(std::string_view component) {
    return component == "." || component == "..";
}

// Calls `visit` with each component of a path, from the front, empty ones left out.
template <typename Visit>
void forEachComponent(std::string_view path, Visit&& visit) {
    while (!path.empty()) {
        const std::size_t end = std::min(path.find('/'), path.size());
        if (end > 0) {
            visit(path.substr(0, end));
        }
        path.remove_prefix(std::min(end + 1, path.size()));
    }
}

bool hasDotComponents(std::string_view path) {
    // Most paths hold no "/." at all.
    if (path.find("/.") == std::string_view::npos) {
        return false;
    }
    bool found = false;
    forEachComponent(
        path, [&](std::string_view component) { found = found || isDotComponent(component); });
    return found;
}

bool isNormalised(std::string_view path) {
    return path.starts_with('/') && path.find("//") == std::string_view::npos &&
           (path.size() == 1 || !path.ends_with('/'));
}

void appendComponents(std::string& path, std::string_view components) {
    forEachComponent(components, [&](std::string_view component) {
        if (!path.ends_with('/')) {
            path += '/';
        }
        path += component;
    });
}

std::string normalised(std::string_view path) {
    if (isNormalised(path)) {
        return std::string(path);
    }
    std::string result = "/";
    result.reserve(path.size() + 1);
    appendComponents(result, path);
    return result;
}

std::string withoutDotComponents(std::string_view path) {
    std::string result;
    result.reserve(path.size());
    forEachComponent(path, [&](std::string_view component) {
        if (component == "..") {
            result.resize(std::min(result.rfind('/'), result.size()));
        } else if (component != ".") {
            result += '/';
            result += component;
        }
    });
    return result.empty() ? "/" : result;
}

// The path in what follows "file:", decoded. Queries and fragments name no other file.
std::optional<std::string> decodedFilePath(std::string_view rest) {
    if (rest.starts_with("//")) {
        rest.remove_prefix(2);
        const std::string_view host = rest.substr(0, std::min(rest.find('/'), rest.size()));
        if (!host.empty() && !equalsIgnoringCase(host, "localhost")) {
            return std::nullopt;
        }
        rest.remove_prefix(host.size());
    }
    if (!rest.starts_with('/')) {
        return std::nullopt;
    }
    auto path = percentDecoded(rest.substr(0, std::min(rest.find_first_of("?#"), rest.size())));
    if (!path || path->find('\0') != std::string::npos) {
        return std::nullopt;
    }
    return path;
}

std::optional<std::string_view> schemeOf(std::string_view text) {
    const std::size_t colon = text.find(':');
    if (colon == std::string_view::npos || colon == 0 || !isLetter(text.front()) ||
        !std::ranges::all_of(text.substr(0, colon), isSchemeCharacter)) {
        return std::nullopt;
    }
    return text.substr(0, colon);
}

ResourceValue prefetchedValue(const PrefetchedValues& values, ResourceKey key,
                              std::string_view lastPathComponent) {
    switch (key) {
        case ResourceKey::name:
        case ResourceKey::localizedName:
            return std::string(lastPathComponent);
        case ResourceKey::typeIdentifier:
            return std::string(values.typeIdentifier);
        case ResourceKey::fileSize:
            return Number(values.fileSize);
        case ResourceKey::creationDate:
            return values.creationDate;
        case ResourceKey::contentModificationDate:
            return values.contentModificationDate;
        case ResourceKey::isReadable:
            return values.isReadable;
        case ResourceKey::isWritable:
            return values.isWritable;
        case ResourceKey::fileID:
            return Number(std::uint64_t{raw(values.fileID)});
        case ResourceKey::documentIdentifier:
            return Number(std::uint64_t{raw(values.documentIdentifier)});
        case ResourceKey::isPackage:
            return values.isPackage;
        case ResourceKey::isDirectory:
            return values.isDirectory;
        case ResourceKey::parentDirectoryURL:
            break;
    }
    return std::monostate();
}

// Values set on a URL after it was made.
class SetValues {
  public:
    [[nodiscard]] std::optional<ResourceValue> value(ResourceKey key) const {
        const MutexLock lock(mutex_);
        const auto found = values_.find(key);
        return found == values_.end() ? std::nullopt : std::optional(found->second);
    }
    void set(ResourceKey key, ResourceValue value) {
        const MutexLock lock(mutex_);
        values_.insert_or_assign(key, std::move(value));
    }

  private:
    mutable Mutex mutex_;
    std::map<ResourceKey, ResourceValue> values_ MARROWDALE_GUARDED_BY(mutex_);
};

enum class Scheme : std::uint8_t { file, other };

}  // namespace

// A listing makes these by the hundred thousand: one allocation, and one for a long text.
struct URL::Body {
    Body(Scheme urlScheme, std::string urlText)
        : text(std::move(urlText)),
          scheme(urlScheme),
          hasDots(urlScheme == Scheme::file && hasDotComponents(text)) {}
    Body(const Body& listedParent, std::shared_ptr<const Body> keptParent, std::string_view name,
         PrefetchedValues&& values)
        : scheme(Scheme::file),
          hasDots(listedParent.hasDots || isDotComponent(name)),
          isListed(true),
          parent(std::move(keptParent)),
          listedValues(std::move(values)) {
        const bool isBelowRoot = listedParent.text.size() == 1;
        text.reserve(listedParent.text.size() + 1 + name.size());
        text += listedParent.text;
        if (!isBelowRoot) {
            text += '/';
        }
        text += name;
    }
    Body(const Body&) = delete;
    Body& operator=(const Body&) = delete;
    ~Body() { delete setValues.load(std::memory_order_acquire); }

    [[nodiscard]] std::string_view lastPathComponent() const {
        const std::string_view path = text;
        return scheme != Scheme::file ? std::string_view()
               : path.size() == 1     ? path
                                      : path.substr(path.rfind('/') + 1);
    }

    // Most URLs never get any, so the table is made with the first value. Of several threads that
    // make one, the first to publish wins.
    SetValues& settableValues() const {
        SetValues* existing = setValues.load(std::memory_order_acquire);
        if (existing == nullptr) {
            auto made = std::make_unique<SetValues>();
            if (setValues.compare_exchange_strong(existing, made.get(), std::memory_order_acq_rel,
                                                  std::memory_order_acquire)) {
                existing = made.release();
            }
        }
        return *existing;
    }

    std::string text;  // a file URL's path, or the whole text of another
    Scheme scheme;
    bool hasDots;  // the path holds "." or ".."
    bool isListed = false;
    std::shared_ptr<const Body> parent;  // of a listed child; else null
    PrefetchedValues listedValues;
    mutable std::atomic<SetValues*> setValues = nullptr;  // owned; null until a value is set
};

URL URL::fileURL(std::string_view path) {
    return URL(std::make_shared<const Body>(Scheme::file, normalised(path)));
}

std::optional<URL> URL::fromAbsoluteString(std::string_view text) {
    const auto scheme = schemeOf(text);
    if (!scheme) {
        return std::nullopt;
    }
    if (equalsIgnoringCase(*scheme, fileScheme)) {
        const auto path = decodedFilePath(text.substr(scheme->size() + 1));
        return path ? std::optional(fileURL(*path)) : std::nullopt;
    }
    const auto decoded = percentDecoded(text);
    if (!decoded || decoded->find('\0') != std::string::npos) {
        return std::nullopt;
    }
    return URL(std::make_shared<const Body>(Scheme::other, std::string(text)));
}

URL URL::listedChild(const URL& parent, std::string_view name, PrefetchedValues values) {
    return URL(std::make_shared<const Body>(*parent.body_, parent.body_, name, std::move(values)));
}

bool URL::isFileURL() const {
    return body_->scheme == Scheme::file;
}

const std::string& URL::path() const {
    static const std::string none;
    return isFileURL() ? body_->text : none;
}

std::string_view URL::lastPathComponent() const {
    return body_->lastPathComponent();
}

std::vector<std::string_view> URL::pathComponents() const {
    std::vector<std::string_view> components;
    if (isFileURL()) {
        components.push_back(std::string_view(body_->text).substr(0, 1));
        forEachComponent(body_->text,
                         [&](std::string_view component) { components.push_back(component); });
    }
    return components;
}

std::string URL::absoluteString() const {
    return isFileURL() ? "file://" + percentEncodedPath(body_->text) : body_->text;
}

URL URL::deletingLastPathComponent() const {
    if (body_->parent) {
        return URL(body_->parent);
    }
    if (!isFileURL() || body_->text.size() == 1) {
        return *this;
    }
    const std::string_view path = body_->text;
    return fileURL(path.substr(0, std::max<std::size_t>(path.rfind('/'), 1)));
}

URL URL::appendingPathComponent(std::string_view component) const {
    if (!isFileURL()) {
        return *this;
    }
    std::string path = body_->text;
    appendComponents(path, component);
    return URL(std::make_shared<const Body>(Scheme::file, std::move(path)));
}

URL URL::standardized() const {
    return body_->hasDots ? fileURL(withoutDotComponents(body_->text)) : *this;
}

std::optional<ResourceValue> URL::cachedResourceValue(ResourceKey key) const {
    if (const SetValues* set = body_->setValues.load(std::memory_order_acquire)) {
        if (auto value = set->value(key)) {
            return value;
        }
    }
    if (!body_->isListed || !body_->listedValues.known.contains(key) ||
        key == ResourceKey::parentDirectoryURL) {
        return std::nullopt;
    }
    if (body_->listedValues.absent.contains(key)) {
        return ResourceValue();
    }
    return prefetchedValue(body_->listedValues, key, lastPathComponent());
}

bool URL::setCachedResourceValue(ResourceKey key, ResourceValue value) const {
    if (key == ResourceKey::parentDirectoryURL) {
        return false;
    }
    body_->settableValues().set(key, std::move(value));
    return true;
}

URL URL::withoutCachedValues() const {
    return URL(std::make_shared<const Body>(body_->scheme, body_->text));
}

const PrefetchedValues* URL::prefetched() const {
    return body_->isListed ? &body_->listedValues : nullptr;
}

bool operator==(const URL& a, const URL& b) {
    return a.body_ == b.body_ ||
           (a.body_->scheme == b.body_->scheme && a.body_->text == b.body_->text);
}

URLRelationship relationship(const URL& container, const URL& item) {
    if (!container.isFileURL() || !item.isFileURL()) {
        return container == item ? URLRelationship::same : URLRelationship::other;
    }
    // Made only where "." or ".." have to be taken out.
    const URL outer = container.standardized();
    const URL inner = item.standardized();
    const std::string_view outerPath = outer.path();
    const std::string_view innerPath = inner.path();
    if (!innerPath.starts_with(outerPath)) {
        return URLRelationship::other;
    }
    if (innerPath.size() == outerPath.size()) {
        return URLRelationship::same;
    }
    const bool atBoundary = outerPath.size() == 1 || innerPath[outerPath.size()] == '/';
    return atBoundary ? URLRelationship::contains : URLRelationship::other;
}

}  // namespace marrowdale
