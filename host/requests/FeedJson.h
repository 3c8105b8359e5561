#pragma once

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "host/requests/Finding.h"
#include "host/requests/HostRequests.h"

namespace marrowdale::host {

// Answers to requests as machine output and the socket have them, one JSON value each, and the way
// back. What can't be read back is EPROTO.

// {"items": [ITEM…], "nextPage": TOKEN or null}
[[nodiscard]] std::string pageJson(const ItemPage& page);
[[nodiscard]] Expected<ItemPage> pageFromJson(std::string_view text);

// {"updated": [ITEM…], "deleted": [IDENTIFIER…], "anchor": TOKEN, "moreComing": …}
[[nodiscard]] std::string changesJson(const ItemChanges& changes);
[[nodiscard]] Expected<ItemChanges> changesFromJson(std::string_view text);

// {"anchor": TOKEN or null}
[[nodiscard]] std::string anchorJson(const std::optional<Data>& anchor);
[[nodiscard]] Expected<std::optional<Data>> anchorFromJson(std::string_view text);

[[nodiscard]] std::string itemJson(const FileProviderItem& item);
[[nodiscard]] Expected<FileProviderItemPtr> itemFromJson(std::string_view text);

// {"KEY": TEXT}
[[nodiscard]] std::string textJson(std::string_view key, std::string_view text);
[[nodiscard]] Expected<std::string> textFromJson(const char* key, std::string_view text);

// {"version": TEXT, "processID": N}
[[nodiscard]] std::string serviceJson(std::string_view version, std::uint64_t processID);
[[nodiscard]] Expected<std::uint64_t> processIDFromJson(std::string_view text);

// {"finding": NAME, "status": …, "message": …} and "advice" where there is some.
[[nodiscard]] std::string findingJson(const Finding& finding);
// {"findings": [FINDING…]}
[[nodiscard]] std::string findingsJson(const std::vector<Finding>& findings);
[[nodiscard]] Expected<std::vector<Finding>> findingsFromJson(std::string_view text);

}  // namespace marrowdale::host
