#include <algorithm>
#include <filesystem>

#include <gmock/gmock.h>

#include "platform/foundation/Base64.h"
#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

class PageTest : public SystemTest {
  protected:
    void makeFiles(int count) const {
        for (int i = 0; i < count; ++i) {
            writeFile(home_.document("file " + std::to_string(i)), "");
        }
    }
    // Every page by a process of its own.
    [[nodiscard]] std::vector<std::vector<Json>> pages(const std::string& item) const {
        std::vector<std::vector<Json>> all;
        Json page = home_.line({"page", item});
        all.push_back(page.at("items"));
        while (!page.at("nextPage").is_null() && all.size() < 100) {
            page = home_.line({"page", item, "--page", text(page, "nextPage")});
            all.push_back(page.at("items"));
        }
        return all;
    }
    // The token of the second page of the root.
    [[nodiscard]] std::string secondPage() const {
        return home_.line({"page", "root"}).at("nextPage").get<std::string>();
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(PageTest);

TEST_P(PageTest, pageByPageInOtherProcessesEqualsTheListing) {
    makeFiles(450);
    const auto all = pages("root");
    ASSERT_EQ(all.size(), 3U);
    EXPECT_EQ(all[0].size(), 200U);
    EXPECT_EQ(all[1].size(), 200U);
    EXPECT_EQ(all[2].size(), 50U);
    std::vector<Json> joined;
    for (const auto& page : all) {
        joined.insert(joined.end(), page.begin(), page.end());
    }
    EXPECT_EQ(joined, home_.lines({"ls"}));
}

TEST_P(PageTest, aDeepListingIsResumedWhereItStood) {
    for (int i = 0; i < 90; ++i) {
        const std::string folder =
            home_.document("folder " + std::to_string(i % 7) + "/" + std::to_string(i));
        makeFolder(folder);
        writeFile(folder + "/a", "");
        writeFile(folder + "/b", "");
    }
    std::vector<Json> joined;
    for (const auto& page : pages("all-directories")) {
        joined.insert(joined.end(), page.begin(), page.end());
    }
    EXPECT_EQ(joined.size(), 7U + 90U * 3U);
    EXPECT_EQ(joined, home_.lines({"ls", "all-directories"}));
}

TEST_P(PageTest, aFolderOfExactlyOnePageEndsWithAnEmptyOne) {
    makeFiles(200);
    const auto all = pages("root");
    ASSERT_EQ(all.size(), 2U);
    EXPECT_EQ(all[0].size(), 200U);
    EXPECT_EQ(all[1].size(), 0U);
}

TEST_P(PageTest, bothInitialPagesGiveTheSameOrder) {
    makeFiles(250);
    const Json byDefault = home_.line({"page", "root"});
    EXPECT_EQ(home_.line({"page", "root", "--page", "name"}).at("items"), byDefault.at("items"));
    EXPECT_EQ(home_.line({"page", "root", "--page", "date"}).at("items"), byDefault.at("items"));
}

TEST_P(PageTest, whatIsAddedWhileAListingIsUnderWayDoesNotDisturbIt) {
    makeFiles(250);
    const Json first = home_.line({"page", "root"});
    const Json rest = home_.line({"page", "root", "--page", text(first, "nextPage")});
    EXPECT_EQ(first.at("items").size() + rest.at("items").size(), 250U);
}

TEST_P(PageTest, aTokenThatIsNoTokenHasExpired) {
    makeFiles(1);
    for (const std::size_t size : {0U, 1U, 47U, 48U, 49U, 1000U}) {
        const std::string token = base64Encoded(Bytes(size, 'x'));
        // An empty value is no option value.
        if (size > 0) {
            EXPECT_EQ(home_.error({"page", "root", "--page", token}, 1)["name"],
                      "syncAnchorExpired")
                << size;
        }
    }
}

TEST_P(PageTest, aTokenOfAnotherStateHasExpired) {
    makeFiles(250);
    const std::string token = secondPage();
    const Json error =
        home_.error({"--state", home_.path("other state"), "page", "root", "--page", token}, 1);
    EXPECT_EQ(error["name"], "syncAnchorExpired");
    EXPECT_EQ(error["code"], -1002);
    EXPECT_EQ(error["domain"], "VantrelFileProviderErrorDomain");
}

TEST_P(PageTest, aTokenOutlivesTheStoresRestartAndNotItsLoss) {
    makeFiles(250);
    const std::string token = secondPage();
    EXPECT_EQ(home_.line({"page", "root", "--page", token}).at("items").size(), 50U);
    std::filesystem::remove_all(home_.path(".local/state/marrowdale"));
    EXPECT_EQ(home_.error({"page", "root", "--page", token}, 1)["name"], "syncAnchorExpired");
}

TEST_P(PageTest, textThatIsNoBase64IsAWrongCommandLine) {
    for (const char* token : {"x", "Nam", "QUI", "QUJD\n", "Q-_D", "====", "QR=="}) {
        EXPECT_EQ(home_.error({"page", "root", "--page", token}, 2)["code"], 2) << token;
    }
}

TEST_P(PageTest, peopleGetTheTokenOfTheNextPageUnderTheTable) {
    makeFiles(201);
    const ChildResult first = home_.run({"page", "root"});
    EXPECT_EQ(first.exitCode, 0);
    const auto at = first.output.find("next page: ");
    ASSERT_NE(at, std::string::npos);
    EXPECT_EQ(std::ranges::count(first.output, '\n'), 201);
    const std::string token = first.output.substr(at + 11, first.output.size() - at - 12);
    const ChildResult second = home_.run({"page", "root", "--page", token});
    EXPECT_EQ(std::ranges::count(second.output, '\n'), 1);
}

}  // namespace
}  // namespace marrowdale::tests
