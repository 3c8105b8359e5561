#pragma once

#include <filesystem>
#include <functional>
#include <future>
#include <memory>
#include <optional>
#include <set>
#include <string>

#include "platform/linux/files/LinuxFilesTestWorld.h"
#include "platform/linux/operations/LinuxFileOperations.h"
#include "platform/linux/operations/OperationMonitor.h"
#include "platform/testing/RecordingLogSink.h"

namespace marrowdale::native {

// For tests of this folder: operations on a served folder "tree", with "outside" and "state" beside
// it. Each call waits for the answer.
class OperationsWorld {
  public:
    explicit OperationsWorld(const std::string& parent,
                             NoReplaceMethod noReplace = NoReplaceMethod::rename,
                             ImportMethod importing = ImportMethod::unnamedFile)
        : directory(parent),
          trees({madeFolder("tree")}, {madeFolder("state")}),
          temporaries(*Temporaries::open(directory.path("state"), &log)),
          operations({trees, packages, *temporaries, noReplace, importing}, &log) {
        makeFolder(directory.path("outside"));
    }

    [[nodiscard]] std::string at(std::string_view name) const {
        return directory.path("tree/" + std::string(name));
    }
    [[nodiscard]] std::string outside(std::string_view name) const {
        return directory.path("outside/" + std::string(name));
    }
    [[nodiscard]] URL url(std::string_view name = {}) const {
        return URL::fileURL(name.empty() ? directory.path("tree") : at(name));
    }
    [[nodiscard]] static std::set<std::string> namesIn(const std::string& folder) {
        std::set<std::string> names;
        for (const auto& entry : std::filesystem::directory_iterator(folder)) {
            names.insert(entry.path().filename().string());
        }
        return names;
    }
    [[nodiscard]] std::set<std::string> names() const { return namesIn(directory.path("tree")); }
    [[nodiscard]] std::set<std::string> notes() const {
        return namesIn(directory.path("state/temporaries"));
    }

    Expected<URL> import(const std::string& source, std::string_view folder = {}) {
        return wait([&](auto handler) {
            operations.importIntoFolder(URL::fileURL(source), url(folder), handler);
        });
    }
    Expected<URL> create(std::string_view name, std::string_view folder = {}) {
        return wait([&](auto handler) { operations.createSubfolder(url(folder), name, handler); });
    }
    Expected<URL> rename(std::string_view item, std::string_view name) {
        return wait([&](auto handler) { operations.renameInPlace(url(item), name, handler); });
    }
    Expected<URL> move(std::string_view item, std::string_view folder,
                       std::optional<std::string> name = std::nullopt) {
        return wait([&](auto handler) {
            operations.moveIntoFolder(url(item), url(folder), name, handler);
        });
    }
    Expected<URL> trash(std::string_view item, std::string_view folder) {
        return wait(
            [&](auto handler) { operations.trashIntoFolder(url(item), url(folder), handler); });
    }
    Expected<URL> avoid(std::string_view item, std::string_view folder) {
        return wait([&](auto handler) {
            operations.moveIntoFolderAvoidingCollision(url(item), url(folder), handler);
        });
    }
    std::optional<Error> remove(std::string_view item) {
        std::promise<std::optional<Error>> answer;
        operations.deleteItemAtURL(
            url(item), [&](const std::optional<Error>& error) { answer.set_value(error); });
        return answer.get_future().get();
    }

  private:
    [[nodiscard]] std::string madeFolder(const std::string& name) const {
        makeFolder(directory.path(name));
        return directory.path(name);
    }
    template <typename Call>
    Expected<URL> wait(const Call& call) {
        std::promise<Expected<URL>> answer;
        call([&](Expected<URL> url) { answer.set_value(std::move(url)); });
        return answer.get_future().get();
    }

  public:
    TemporaryDirectory directory;
    std::shared_ptr<RecordingLogSink> sink = std::make_shared<RecordingLogSink>();
    Log log{sink, LogLevel::error};
    PackageTypes packages;
    ServedTrees trees;
    std::unique_ptr<Temporaries> temporaries;
    LinuxFileOperations operations;
};

// Cancels when a test says so, and remembers what it was told.
class TestMonitor final : public OperationMonitor {
  public:
    std::function<bool(const OperationProgress&)> cancelWhen = [](const auto&) { return false; };
    OperationProgress last;
    std::vector<std::string> warnings;

    void progressed(const OperationProgress& progress) override {
        last = progress;
        cancelled_ = cancelled_ || cancelWhen(progress);
    }
    void warned(const std::string& text) override { warnings.push_back(text); }
    bool isCancelled() override { return cancelled_; }
    void cancel() { cancelled_ = true; }

  private:
    std::atomic<bool> cancelled_ = false;
};

struct OperationsTest : testing::TestWithParam<TestFileSystem> {
    OperationsWorld world_{GetParam().dir};
};

// The code of what came instead of a result; 0 for a result.
template <typename T>
[[nodiscard]] int codeOf(const Expected<T>& answer) {
    return answer ? 0 : answer.error().code;
}

inline constexpr int taken = static_cast<int>(FileErrorCode::fileExists);

}  // namespace marrowdale::native
