#pragma once

#include "platform/Platform.h"
#include "platform/hostframework/FileProviderActions.h"

// How actions on items end.

namespace marrowdale {

// The error as the host gets it: a file in the way becomes the framework's collision with the item
// there. Where that item can't be made, and for every other error, it is the platform's own.
[[nodiscard]] Error hostError(const Platform& platform, const Error& error);

// The item that stands at a URL now, or why there is none.
[[nodiscard]] Expected<FileProviderItemPtr> freshItemAt(const Platform& platform, const URL& url);

// What the host gets for what a file operation answered: the item made afresh at the URL, or the
// error.
[[nodiscard]] Expected<FileProviderItemPtr> hostAnswer(const Platform& platform,
                                                       const Expected<URL>& answer);

}  // namespace marrowdale
