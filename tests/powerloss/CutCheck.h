#pragma once

#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "platform/linux/store/Store.h"
#include "tests/powerloss/HandedOut.h"
#include "tests/powerloss/StoreRun.h"

namespace marrowdale::tests {

// Looks at a store after a power cut, on the disk that is mounted on `disk`: whether what it handed
// out before is still good. Each thing that is not is one complaint, in words. One thread.
class CutCheck {
  public:
    // The power was cut at `position` of the log.
    CutCheck(std::string disk, Workload workload, const HandedOut& out, std::size_t position);

    // Opens the store and looks at everything.
    [[nodiscard]] std::vector<std::string> run();

    // How much there was to look at, so that a test knows that it tested something.
    [[nodiscard]] std::size_t documentsFound() const { return documentsFound_; }
    [[nodiscard]] std::size_t differences() const { return differences_; }

  private:
    // What is known of a document that was handed out before the cut.
    struct Document {
        std::set<FileKey> files;  // that it was handed out for
        FileKey last;
        std::string name;       // where it stands for good; empty: it goes with its file
        bool mayBeGone = true;  // from the file that it was handed out for last
    };
    struct Happened {
        std::string path;
        std::uint32_t flags = 0;
        std::string text;
    };
    using Events = std::map<EventID, Happened>;

    [[nodiscard]] bool isBeforeCut(const auto& thing) const { return thing.position <= position_; }
    void complain(std::string text) { complaints_.push_back(std::move(text)); }
    void gatherDocuments();

    [[nodiscard]] bool open();
    void checkDocuments();
    void checkDocumentsOf(const std::string& folder);
    void checkOwner(DocumentID document, const std::string& path, const FileKey& file);
    void checkResolution(DocumentID document, const Document& known);
    void checkEvents();
    [[nodiscard]] bool isPruned(EventID event);
    [[nodiscard]] Events eventsSince(EventID since);
    void checkAnchor(const HandedOut::Anchor& anchor);
    void checkLifeGoesOn();

    std::string disk_;
    std::string root_;
    Workload workload_;
    const HandedOut& out_;
    std::size_t position_;
    std::map<DocumentID, Document> documents_;
    EventID lastEvent_{};                             // handed out before the cut
    Tree tree_;                                       // after it
    std::set<FileKey> files_;                         // in it
    std::map<DocumentID, std::set<FileKey>> owners_;  // after it
    std::unique_ptr<native::Store> store_;
    std::vector<std::string> complaints_;
    std::size_t documentsFound_ = 0;
    std::size_t differences_ = 0;
};

}  // namespace marrowdale::tests
