#include "platform/linux/icons/ApplicationIcons.h"

#include <algorithm>
#include <fcntl.h>
#include <utility>

#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/icons/BuiltInIcon.h"
#include "platform/linux/icons/CachedBitmap.h"

namespace marrowdale::native {

namespace {

constexpr const char* genericIcon = "application-x-executable";

bool isOfScaleOne(int variant) {
    return variant == 0 || variant == 1;
}

std::string dateText(const Date& date) {
    return std::to_string(date.seconds) + "." + std::to_string(date.nanoseconds);
}

}  // namespace

std::optional<unsigned> pixelsOfVariant(int variant) {
    switch (variant) {
        case 0:
            return 60;
        case 1:
            return 76;
        case 15:
            return 120;
        case 24:
            return 152;
        case 32:
            return 180;
        default:
            return std::nullopt;
    }
}

ApplicationIcons::ApplicationIcons(IconTheme::Places places, IconRenderer renderer, IconCache cache)
    : places_(std::move(places)), renderer_(std::move(renderer)), cache_(std::move(cache)) {}

ApplicationIcons::~ApplicationIcons() = default;

std::optional<Data> ApplicationIcons::iconData(const std::optional<std::string>& icon,
                                               int variant) {
    using Enlarging = IconRenderer::Enlarging;
    const auto pixels = pixelsOfVariant(variant);
    if (!pixels) {
        return std::nullopt;
    }
    const auto enlarging = isOfScaleOne(variant) ? Enlarging::yes : Enlarging::no;
    if (icon) {
        if (auto data = ownIcon(*icon, *pixels, enlarging)) {
            return data;
        }
    }
    if (!isOfScaleOne(variant)) {
        return std::nullopt;
    }
    if (auto data = ownIcon(genericIcon, *pixels, enlarging)) {
        return data;
    }
    return *cachedBitmapWithImage(builtInIcon(*pixels));
}

std::optional<Data> ApplicationIcons::ownIcon(const std::string& icon, unsigned pixels,
                                              IconRenderer::Enlarging enlarging) {
    if (const auto known = remembered(icon, pixels)) {
        if (signatureOf(known->path) == known->signature) {
            return known->data;
        }
    }
    // Of a file that is named itself no theme knows anything.
    const auto path = icon.starts_with('/') ? std::optional(icon) : theme()->find(icon, pixels);
    const auto signature = path ? signatureOf(*path) : std::nullopt;
    if (!signature) {
        return std::nullopt;
    }
    Remembered found{icon, pixels, *path, *signature, drawn(*path, *signature, pixels, enlarging)};
    auto data = found.data;
    remember(std::move(found));
    return data;
}

std::optional<Data> ApplicationIcons::drawn(const std::string& path, const Signature& signature,
                                            unsigned pixels, IconRenderer::Enlarging enlarging) {
    const std::string key = path + '\0' + std::to_string(raw(signature.fileID)) + " " +
                            std::to_string(signature.size) + " " + dateText(signature.modified) +
                            " " + dateText(signature.changed) + " " + std::to_string(pixels);
    if (auto kept = cache_.find(key)) {
        return kept;
    }
    const auto data = renderer_.render(path, pixels, enlarging);
    {
        const std::lock_guard lock(mutex_);
        ++drawn_;
    }
    if (!data) {
        return std::nullopt;
    }
    cache_.keep(key, *data);
    return *data;
}

std::optional<ApplicationIcons::Signature> ApplicationIcons::signatureOf(const std::string& path) {
    const auto status = statTarget(AT_FDCWD, path.c_str());
    if (!status || !status->isRegular()) {
        return std::nullopt;
    }
    return Signature{status->device, status->fileID, status->size, status->modified,
                     status->changed};
}

std::optional<ApplicationIcons::Remembered> ApplicationIcons::remembered(const std::string& icon,
                                                                         unsigned pixels) const {
    const std::lock_guard lock(mutex_);
    const auto known = std::ranges::find_if(remembered_, [&](const Remembered& each) {
        return each.pixels == pixels && each.icon == icon;
    });
    return known == remembered_.end() ? std::nullopt : std::optional(*known);
}

void ApplicationIcons::remember(Remembered found) {
    const std::lock_guard lock(mutex_);
    std::erase_if(remembered_, [&](const Remembered& each) {
        return each.pixels == found.pixels && each.icon == found.icon;
    });
    remembered_.push_back(std::move(found));
    if (remembered_.size() > mostRemembered) {
        remembered_.pop_front();
    }
}

std::shared_ptr<const IconTheme> ApplicationIcons::theme() {
    const std::lock_guard lock(mutex_);
    if (!theme_) {
        theme_ = std::make_shared<const IconTheme>(places_);
    }
    return theme_;
}

void ApplicationIcons::forget() {
    const std::lock_guard lock(mutex_);
    theme_ = nullptr;
    remembered_.clear();
}

std::uint64_t ApplicationIcons::drawn() const {
    const std::lock_guard lock(mutex_);
    return drawn_;
}

}  // namespace marrowdale::native
