#include <gtest/gtest.h>

#include "host/browser/SignedAddresses.h"

namespace marrowdale::host {
namespace {

using View = SignedPlace::View;

class SignedAddressesTest : public ::testing::Test {
  protected:
    [[nodiscard]] std::optional<SignedPlace> placeAt(const std::string& address) const {
        const auto request = ApiRequest::fromTarget("GET", address);
        return request ? addresses_.placeAt(*request) : std::nullopt;
    }
    SignedAddresses::Clock::time_point now_ = SignedAddresses::Clock::now();
    SignedAddresses addresses_{[this] { return now_; }};
};

TEST_F(SignedAddressesTest, anAddressLeadsToWhatItWasMadeFor) {
    for (const View view : {View::content, View::download}) {
        const SignedPlace place{view, "#org.example.Notes\n?&%=\xFF", 7};
        EXPECT_EQ(placeAt(addresses_.addressOf(place)), place);
    }
}

TEST_F(SignedAddressesTest, aNameAtItsEndIsForPeople) {
    const SignedPlace place{View::content, "did=12", 7};
    const std::string address = addresses_.addressOf(place, "a b?.pdf\xFF");
    EXPECT_EQ(address.substr(0, address.find('?')), "/files/content/did%3D12/a%20b%3F.pdf%FF");
    EXPECT_EQ(placeAt(address), place);
    EXPECT_FALSE(placeAt("/files/content/did%3D12/a/b" + address.substr(address.find('?'))));
}

TEST_F(SignedAddressesTest, aChangedAddressLeadsNowhere) {
    const std::string address = addresses_.addressOf({View::download, "did=12", 7});
    const auto changed = [&](const std::string& from, const std::string& to) {
        std::string other = address;
        return other.replace(other.find(from), from.size(), to);
    };
    EXPECT_FALSE(placeAt(changed("did%3D12", "did%3D13")));
    EXPECT_FALSE(placeAt(changed("download", "content")));
    EXPECT_FALSE(placeAt(changed("download", "other")));
    EXPECT_FALSE(placeAt(changed("session=7", "session=8")));
    EXPECT_FALSE(placeAt(changed("session=7", "session=-7")));
    EXPECT_FALSE(placeAt(changed("until=", "until=9")));
    EXPECT_FALSE(placeAt(changed("signature=", "signature=0")));
    EXPECT_FALSE(placeAt(address.substr(0, address.find("&signature"))));
    EXPECT_FALSE(placeAt("/files/download/did%3D12"));
    EXPECT_TRUE(placeAt(address));
}

TEST_F(SignedAddressesTest, anAddressGrowsOld) {
    const std::string address = addresses_.addressOf({View::download, "did=12", 7});
    now_ += SignedAddresses::lifetime;
    EXPECT_TRUE(placeAt(address));
    now_ += std::chrono::seconds(1);
    EXPECT_FALSE(placeAt(address));
}

TEST_F(SignedAddressesTest, anotherProcessSignsInAnotherWay) {
    const SignedAddresses other([this] { return now_; });
    EXPECT_FALSE(placeAt(other.addressOf({View::download, "did=12", 7})));
}

}  // namespace
}  // namespace marrowdale::host
