#pragma once

#include <memory>

#include <nlohmann/json_fwd.hpp>

#include "platform/hostframework/FileProviderItem.h"

namespace marrowdale::host {

// An item that came over a socket: what ItemJson writes, read back.
class ReceivedItem final : public FileProviderItem {
  public:
    // Null when the identifier, the name or the path is missing.
    [[nodiscard]] static std::shared_ptr<const ReceivedItem> fromJson(const nlohmann::json& object);

    [[nodiscard]] bool hx_isContainer() const override { return isContainer_; }
    [[nodiscard]] bool isFolder() const override { return isFolder_; }
    [[nodiscard]] std::string description() const override;

  private:
    explicit ReceivedItem(URL url) : FileProviderItem(std::move(url)) {}

    bool isContainer_ = false;
    bool isFolder_ = false;
};

}  // namespace marrowdale::host
