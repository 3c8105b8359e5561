#include <functional>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/daemon/ReplicaKeeper.h"
#include "host/testing/FakeExtension.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// A host whose feed brings what a test says.
class FakeHost final : public ItemRequests, public FeedRequests {
  public:
    std::vector<FileProviderItemPtr> listed;
    std::vector<FileProviderItemPtr> updated;
    std::function<void()> whileChangesAreAsked = [] {};

    Expected<FileProviderItemPtr> item(std::string_view identifier) override {
        return Unexpected(errorForNonExistentItem(identifier));
    }
    Expected<std::string> identifierAt(std::string_view path) override {
        return Unexpected(errorForNonExistentItem(path));
    }
    Expected<std::string> pathOf(std::string_view identifier) override {
        return Unexpected(errorForNonExistentItem(identifier));
    }
    Expected<std::unique_ptr<ItemListing>> listing(std::string_view /*container*/) override {
        class OnePage final : public ItemListing {
          public:
            explicit OnePage(std::vector<FileProviderItemPtr> items) : items_(std::move(items)) {}
            Expected<ItemPage> page(const Data& /*page*/) override {
                return ItemPage{.items = items_, .nextPage = std::nullopt};
            }

          private:
            std::vector<FileProviderItemPtr> items_;
        };
        return std::unique_ptr<ItemListing>(std::make_unique<OnePage>(listed));
    }
    Expected<std::optional<Data>> anchor(std::string_view /*container*/) override {
        return std::optional(Data::fromText("anchor"));
    }
    Expected<ItemChanges> changes(std::string_view /*container*/, const Data& /*since*/) override {
        whileChangesAreAsked();
        return ItemChanges{std::exchange(updated, {}), {}, Data::fromText("next"), MoreComing::no};
    }
    Expected<void> watch(const std::vector<std::string>& /*containers*/,
                         const std::function<void()>& /*ready*/, const SignalTaker& /*taker*/,
                         std::stop_token /*stop*/) override {
        return {};
    }
};

FileProviderItemPtr itemOf(std::string_view identifier, const std::string& application) {
    auto item = std::make_shared<FakeItem>(identifier, "/x/" + std::string(identifier));
    item->hx_appContainerBundleIdentifier = application;
    return item;
}

class ReplicaKeeperTest : public ::testing::Test {
  protected:
    std::vector<std::string> found() {
        std::vector<std::string> identifiers;
        const auto items = keeper_.search({});
        EXPECT_TRUE(items.has_value());
        for (const auto& item : items.value_or(std::vector<FileProviderItemPtr>())) {
            identifiers.push_back(item->itemIdentifier);
        }
        return identifiers;
    }
    FakeHost host_;
    ReplicaKeeper keeper_{host_, host_, ":memory:"};
};

TEST_F(ReplicaKeeperTest, itemsOfARemovedDomainAreNotFoundAnyMore) {
    host_.listed = {itemOf("did=1", "org.example.A"), itemOf("did=2", "org.example.B")};
    EXPECT_THAT(found(), ElementsAre("did=1", "did=2"));
    keeper_.removeDomains({"#org.example.A"});
    EXPECT_THAT(found(), ElementsAre("did=2"));
    keeper_.removeDomains({"#org.example.B", "#org.example.C"});
    EXPECT_THAT(found(), IsEmpty());
}

TEST_F(ReplicaKeeperTest, aRemovalWaitsForNobodyWhoWaitsForIt) {
    host_.listed = {itemOf("did=1", "org.example.A")};
    EXPECT_THAT(found(), ElementsAre("did=1"));
    host_.whileChangesAreAsked = [this] { keeper_.removeDomains({"#org.example.A"}); };
    EXPECT_THAT(found(), IsEmpty());
}

TEST_F(ReplicaKeeperTest, whatCameBackInTheSameAnswerStays) {
    host_.listed = {itemOf("did=1", "org.example.A"), itemOf("did=2", "org.example.A")};
    EXPECT_THAT(found(), ElementsAre("did=1", "did=2"));
    host_.updated = {itemOf("did=2", "org.example.A")};
    keeper_.removeDomains({"#org.example.A"});
    EXPECT_THAT(found(), ElementsAre("did=2"));
}

}  // namespace
}  // namespace marrowdale::host
