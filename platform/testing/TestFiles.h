#pragma once

#include <chrono>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace marrowdale {

// Shorthands for what tests do to the disk. Each throws std::system_error, naming the path, where
// the system refuses.

// Makes or replaces the contents of the file; the folder it is in must exist.
void writeFile(const std::string& path, std::string_view contents);
[[nodiscard]] std::string readFile(const std::string& path);

// With the folders above it that are missing.
void makeFolder(const std::string& path);

// Extended attributes of the thing itself (links are not followed), by their full names, the
// "user." included.
void setAttribute(const std::string& path, const std::string& name, std::string_view value);
// None when there is no such attribute.
[[nodiscard]] std::optional<std::string> attribute(const std::string& path,
                                                   const std::string& name);
// Whether the file system of that folder keeps "user." attributes.
[[nodiscard]] bool keepsUserAttributes(const std::string& folder);

// The folder where this test's own program lies. Other programs of the same build lie beside it,
// and tests find them there, so that a build can be copied to another place and tested there.
[[nodiscard]] std::string programFolder();

// Asks `condition` again and again until it holds; false when it did not within `deadline`. For
// conditions that some other thread or process brings about.
[[nodiscard]] bool waitUntil(const std::function<bool()>& condition,
                             std::chrono::milliseconds deadline = std::chrono::seconds(30));

}  // namespace marrowdale
