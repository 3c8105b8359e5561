#pragma once

#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>

#include "platform/foundation/Date.h"
#include "platform/foundation/Identifiers.h"
#include "platform/linux/icons/IconCache.h"
#include "platform/linux/icons/IconRenderer.h"
#include "platform/linux/icons/IconTheme.h"

namespace marrowdale::native {

// The size in pixels of an icon's variant: 0 and 1 are 60 and 76, 15 and 24 are 120 and 152, 32 is
// 180. None for other numbers.
[[nodiscard]] std::optional<unsigned> pixelsOfVariant(int variant);

// The icons of applications, in the cached-bitmap form: found in the icon theme, drawn once, and
// kept on disk. Pictures made of pixels are not enlarged for the variants of large screens, which
// then have none; at variants 0 and 1 there always is an icon: the application's own, else the
// theme's for any application, else one that needs no file. Any thread.
class ApplicationIcons {
  public:
    ApplicationIcons(IconTheme::Places places, IconRenderer renderer, IconCache cache);
    ~ApplicationIcons();
    ApplicationIcons(const ApplicationIcons&) = delete;
    ApplicationIcons& operator=(const ApplicationIcons&) = delete;

    // `icon`: a name in the theme, or the absolute path of a file; none for no icon of its own.
    [[nodiscard]] std::optional<Data> iconData(const std::optional<std::string>& icon, int variant);
    // Where icons were found is remembered until this is called: applications came or went, or
    // brought other icons.
    void forget();

    // How many pictures were drawn so far, rather than found drawn.
    [[nodiscard]] std::uint64_t drawn() const;

  private:
    // What tells one state of a file from another.
    struct Signature {
        DeviceID device{};
        FileID fileID{};
        std::uint64_t size = 0;
        Date modified;
        Date changed;
        friend bool operator==(const Signature&, const Signature&) = default;
    };
    struct Remembered {
        std::string icon;
        unsigned pixels = 0;
        std::string path;
        Signature signature;
        std::optional<Data> data;  // none: it can't be drawn at that size
    };
    static constexpr std::size_t mostRemembered = 64;

    [[nodiscard]] static std::optional<Signature> signatureOf(const std::string& path);
    [[nodiscard]] std::optional<Data> ownIcon(const std::string& icon, unsigned pixels,
                                              IconRenderer::Enlarging enlarging);
    [[nodiscard]] std::optional<Remembered> remembered(const std::string& icon,
                                                       unsigned pixels) const;
    [[nodiscard]] std::optional<Data> drawn(const std::string& path, const Signature& signature,
                                            unsigned pixels, IconRenderer::Enlarging enlarging);
    void remember(Remembered found);
    [[nodiscard]] std::shared_ptr<const IconTheme> theme();

    const IconTheme::Places places_;
    const IconRenderer renderer_;
    const IconCache cache_;
    mutable std::mutex mutex_;
    std::shared_ptr<const IconTheme> theme_;  // guarded by mutex_; null: to be read
    std::deque<Remembered> remembered_;       // oldest first; guarded by mutex_
    std::uint64_t drawn_ = 0;                 // guarded by mutex_
};

}  // namespace marrowdale::native
