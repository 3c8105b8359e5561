#pragma once

#include <string_view>

#include "platform/foundation/ResourceValue.h"
#include "platform/linux/files/EntryStatus.h"
#include "platform/linux/files/FileSources.h"

namespace marrowdale::native {

// The resource values that follow from a status and a name, without another system call.

// Fills in everything but access, attributes, status and the document identifier. `known` becomes
// `keys` without what is derived from the URL and what the caller has yet to find; `absent` the
// keys that such an entry has no value for.
[[nodiscard]] PrefetchedValues describeEntry(const EntryStatus& status, std::string_view name,
                                             ResourceKeySet keys, const FileSources& sources);

// A directory whose name makes it a package.
[[nodiscard]] bool isPackage(const EntryStatus& status, std::string_view name,
                             const PackageTypes& packages);

// Plain folders have no document identifier; everything else has, links and pipes included.
[[nodiscard]] bool hasDocumentIdentifier(const PrefetchedValues& values);

// What a status query answers. A folder's link count is 2 and the number of its subfolders, taken
// from the index where the file system does not count them, and 2 to 65,537 whatever either says.
[[nodiscard]] FileStatus fileStatusOf(const EntryStatus& status, DocumentIndex& documents);

}  // namespace marrowdale::native
