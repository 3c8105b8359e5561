#include "providers/marrowdale/items/ItemMetadata.h"

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/foundation/Utf8.h"
#include "providers/marrowdale/items/FileSystemAccess.h"
#include "providers/marrowdale/items/TagData.h"

namespace marrowdale {

namespace {

// Reads one item's attributes, and remembers whether all of it went without a line in the log.
class Reader {
  public:
    Reader(const Platform& platform, const URL& url) : platform_(platform), url_(url) {}

    ItemMetadata read(LastUsedDate lastUsedDate) {
        ItemMetadata metadata;
        if (lastUsedDate == LastUsedDate::read) {
            metadata.lastUsedDate = archived<Date>(lastUsedDateAttribute);
        }
        metadata.tagData = tagData();
        metadata.favoriteRank = archived<Number>(favoriteRankAttribute);
        return metadata;
    }

    bool wentWell() const { return wentWell_; }

  private:
    std::optional<Data> value(std::string_view name) {
        auto data = initWithValueOfXattr(platform_, name, url_);
        const PrefetchedValues* values = url_.prefetched();
        if (!data && values && values->attributes) {
            const auto known = values->attributes->value(name);
            wentWell_ = wentWell_ && known && !*known;  // missing, not unreadable
        }
        return data;
    }

    std::string source(std::string_view name) const {
        return std::string(name) + " of \"" + url_.path() + "\"";
    }

    template <typename Class>
    std::optional<Class> archived(std::string_view name) {
        const auto data = value(name);
        if (!data) {
            return std::nullopt;
        }
        auto object = unarchivedObject<Class>(platform_, *data, source(name));
        wentWell_ = wentWell_ && object;
        return object ? std::optional<Class>(std::move(*object)) : std::nullopt;
    }

    std::optional<Data> tagData() {
        const auto names = archived<ArchivedArray>(tagDataAttribute);
        if (!names) {
            return std::nullopt;
        }
        std::vector<Tag> tags;
        for (const ArchivedObject& name : *names) {
            const auto* label = name.as<std::string>();
            if (!label) {
                detail::logUnexpectedClass(platform_, name.className(), source(tagDataAttribute));
                return failed();
            }
            if (!isUtf8(*label)) {
                // A tag list that could not be handed over would hide the good ones too.
                platform_.log.error("left out a tag that is not UTF-8 in " +
                                    source(tagDataAttribute));
                wentWell_ = false;
                continue;
            }
            tags.push_back({.label = *label, .color = 0});
        }
        const auto encoded = encodeTagData(tags);
        return encoded ? std::optional(*encoded) : failed();
    }

    std::optional<Data> failed() {
        wentWell_ = false;
        return std::nullopt;
    }

    const Platform& platform_;
    const URL& url_;
    bool wentWell_ = true;
};

// The set that a listing brought along, if it answers for all attributes.
const AttributeSet* listedAttributes(const URL& url) {
    const PrefetchedValues* values = url.prefetched();
    const AttributeSet* set = values ? values->attributes.get() : nullptr;
    const bool isComplete = set && set->covers(lastUsedDateAttribute) &&
                            set->covers(tagDataAttribute) && set->covers(favoriteRankAttribute);
    return isComplete ? set : nullptr;
}

}  // namespace

ItemMetadata readItemMetadata(const Platform& platform, const URL& url, LastUsedDate lastUsedDate) {
    const AttributeSet* set = listedAttributes(url);
    if (!set || lastUsedDate == LastUsedDate::leftOut) {
        return Reader(platform, url).read(lastUsedDate);
    }
    if (set->empty()) {
        return {};
    }
    if (const auto decoded = set->derived()) {
        return *std::static_pointer_cast<const ItemMetadata>(decoded);
    }
    Reader reader(platform, url);
    ItemMetadata metadata = reader.read(lastUsedDate);
    if (reader.wentWell()) {
        // A set that gave rise to lines in the log is decoded each time, so that they appear again.
        set->setDerived(std::make_shared<const ItemMetadata>(metadata));
    }
    return metadata;
}

}  // namespace marrowdale
