// Whatever the text of an identifier is, resolving it ends, and never in a document that the text
// does not name.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "platform/foundation/FatalError.h"
#include "platform/testing/FakePlatform.h"
#include "platform/testing/PlatformVariants.h"
#include "providers/marrowdale/items/ItemForIdentifier.h"
#include "providers/marrowdale/items/MRFileObjectIdentifier.h"

namespace {

// Knows every document by the number of its file.
class EveryDocument : public marrowdale::GenerationStore {
  public:
    marrowdale::Expected<marrowdale::FileID> resolveDocumentID(
        marrowdale::DocumentID document, marrowdale::DeviceID /*device*/) override {
        return marrowdale::FileID{raw(document)};
    }
    marrowdale::Expected<marrowdale::DocumentID> getOrAllocateDocumentID(
        const marrowdale::OpenFile& /*file*/) override {
        return marrowdale::DocumentID{1};
    }
    marrowdale::Expected<marrowdale::DocumentID> permanentStorageForItemAtURL(
        const marrowdale::URL& /*url*/, marrowdale::AllocateIfNone /*allocateIfNone*/) override {
        return marrowdale::DocumentID{1};
    }
    marrowdale::Expected<void> allocatePermanentStorage(
        std::span<const std::string> /*paths*/) override {
        return {};
    }
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size) {
    const std::string text(bytes, bytes + size);
    marrowdale::FakePlatform fake;
    EveryDocument documents;
    fake.fileSystem.pathAnswer = [](marrowdale::DeviceID, marrowdale::FileID file) {
        return marrowdale::Expected<std::string>("/storage/" + std::to_string(raw(file)));
    };
    const marrowdale::Platform platform = marrowdale::withGenerationStore(fake.platform, documents);
    const auto url = marrowdale::fileURLWithItemIdentifier(platform, text);
    if (url && text.starts_with("did=")) {
        // The number in the place is the one in the text, with nothing cut off its front.
        const std::string number(url->lastPathComponent());
        const auto digits = text.find_first_of("123456789");
        if (digits == std::string::npos || text.compare(digits, number.size(), number) != 0) {
            marrowdale::fatalError("resolved to another document");
        }
    }
    (void)marrowdale::itemForIdentifierString(platform, text);
    return 0;
}
