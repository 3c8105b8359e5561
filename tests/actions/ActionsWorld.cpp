#include "tests/actions/ActionsWorld.h"

#include "platform/testing/TestFiles.h"

namespace marrowdale::tests {

namespace fs = std::filesystem;

namespace {

template <typename Call>
ActionsWorld::Item answerTo(const Call& call) {
    std::promise<ActionsWorld::Item> answer;
    call(
        ItemCompletionHandler([&](ActionsWorld::Item item) { answer.set_value(std::move(item)); }));
    return answer.get_future().get();
}

}  // namespace

int stress() {
    const char* value = std::getenv("MARROWDALE_STRESS");  // NOLINT(concurrency-mt-unsafe)
    const long times = value != nullptr ? std::strtol(value, nullptr, 10) : 1;
    return times > 0 && times <= 1000 ? static_cast<int>(times) : 1;
}

ActionsWorld::ActionsWorld(const std::string& parent) : directory_(parent) {
    makeFolder(path("box"));
    makeFolder(directory_.path("outside"));
}

void ActionsWorld::open(native::StoreOptions::Recording recording) {
    native::StoreOptions options;
    options.recording = recording;
    world_ = std::make_unique<TestWorld>(directory_, options);
    provider_ = std::make_unique<LocalFileProvider>(world_->platform);
}

void ActionsWorld::openAfterKill() {
    open();
    native::Store& store = *world_->store;
    world_->temporaries->sweep(
        [&](FileID folder) { return store.pathForFileID(store.device(), folder); });
}

void ActionsWorld::close() {
    provider_.reset();
    world_.reset();
}

std::string ActionsWorld::identifierOf(std::string_view below) {
    return provider_->persistentIdentifierForItemAtURL(URL::fileURL(path(below))).value_or("");
}

ActionsWorld::Item ActionsWorld::import(const std::string& source, const std::string& parent) {
    return answerTo([&](auto handler) {
        provider_->importDocumentAtURL(URL::fileURL(source), parent, handler);
    });
}

ActionsWorld::Item ActionsWorld::create(const std::string& name, const std::string& parent) {
    return answerTo(
        [&](auto handler) { provider_->createDirectoryWithName(name, parent, handler); });
}

ActionsWorld::Item ActionsWorld::rename(const std::string& item, const std::string& name) {
    return answerTo(
        [&](auto handler) { provider_->renameItemWithIdentifier(item, name, handler); });
}

ActionsWorld::Item ActionsWorld::move(const std::string& item, const std::string& parent,
                                      std::optional<std::string> name) {
    return answerTo([&](auto handler) {
        provider_->reparentItemWithIdentifier(item, parent, std::move(name), handler);
    });
}

ActionsWorld::Item ActionsWorld::trash(const std::string& item) {
    return answerTo([&](auto handler) { provider_->trashItemWithIdentifier(item, handler); });
}

ActionsWorld::Item ActionsWorld::untrash(const std::string& item,
                                         std::optional<std::string> parent) {
    return answerTo([&](auto handler) {
        provider_->untrashItemWithIdentifier(item, std::move(parent), handler);
    });
}

ActionsWorld::Failure ActionsWorld::remove(const std::string& item) {
    std::promise<Failure> answer;
    provider_->deleteItemWithIdentifier(item,
                                        [&](const Failure& error) { answer.set_value(error); });
    return answer.get_future().get();
}

ActionsWorld::Item ActionsWorld::favorite(const std::string& item, std::uint64_t rank) {
    return answerTo([&](auto handler) { provider_->setFavoriteRank(Number(rank), item, handler); });
}

std::map<std::string, std::string> ActionsWorld::picture() const {
    std::map<std::string, std::string> found;
    for (const auto& entry : fs::recursive_directory_iterator(root())) {
        const std::string below = entry.path().string().substr(root().size() + 1);
        if (entry.is_directory()) {
            found.emplace(below + "/", "");
        } else if (entry.is_regular_file()) {
            found.emplace(below, readFile(entry.path().string()));
        }
    }
    return found;
}

std::set<std::string> ActionsWorld::leftOvers() const {
    std::set<std::string> found;
    for (const auto& entry : fs::recursive_directory_iterator(root())) {
        const std::string name = entry.path().filename().string();
        if (name.starts_with(".") && name != ".Trash") {
            found.insert(entry.path().string());
        }
    }
    for (const auto& entry : fs::directory_iterator(directory_.path("state/temporaries"))) {
        found.insert(entry.path().string());
    }
    return found;
}

}  // namespace marrowdale::tests
