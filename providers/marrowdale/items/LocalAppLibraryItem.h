#pragma once

#include <memory>

#include "providers/marrowdale/items/LocalItem.h"

namespace marrowdale {

// The record of an app library: the documents folder of an application, shown directly under the
// root with the application's name and identifier.
class LocalAppLibraryItem : public LocalItem {
  public:
    using LocalItem::LocalItem;

    // Null, after one line in the log, when the record has no data container or its documents
    // folder can't be served.
    [[nodiscard]] static std::shared_ptr<LocalAppLibraryItem> initFrom(const Platform& platform,
                                                                       const BundleRecord& record);

    [[nodiscard]] bool hx_isContainer() const override { return true; }

  protected:
    [[nodiscard]] std::string_view className() const override { return "LocalAppLibraryItem"; }

  private:
    void leaveOutHiddenFolders(const Platform& platform);
};

}  // namespace marrowdale
