#include <algorithm>
#include <filesystem>
#include <functional>
#include <set>
#include <sys/stat.h>

#include <gmock/gmock.h>

#include "platform/foundation/Base64.h"
#include "platform/foundation/PropertyList.h"
#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

using ::testing::HasSubstr;

// What happened between two runs of the program, and what the second one makes of it.
class HistoryTest : public SystemTest {
  protected:
    // Something that is done to the documents, by its name.
    struct Deed {
        const char* name;
        std::function<void()> run;
    };

    void makeFiles(int count) const {
        for (int i = 0; i < count; ++i) {
            writeFile(home_.document("file " + std::to_string(i)), "");
        }
    }
    // The token of the second page of the root.
    [[nodiscard]] std::string secondPage() const {
        return home_.line({"page", "root"}).at("nextPage").get<std::string>();
    }
    [[nodiscard]] Json page(const std::string& token) const {
        return home_.line({"page", "root", "--page", token});
    }
    // The log of asking for that page.
    [[nodiscard]] std::string logOf(const std::string& token) const {
        return home_.run({"--verbose", "page", "root", "--page", token}).errors;
    }
    void expectExpired(const std::string& token) const {
        const Json error = home_.error({"page", "root", "--page", token}, 1);
        EXPECT_EQ(error["name"], "syncAnchorExpired");
        EXPECT_EQ(error["code"], -1002);
    }

    void write(std::string_view name, std::string_view contents) const {
        writeFile(home_.document(name), contents);
    }
    void rename(std::string_view from, std::string_view to) const {
        std::filesystem::rename(home_.document(from), home_.document(to));
    }
    void remove(std::string_view name) const {
        ASSERT_TRUE(std::filesystem::remove(home_.document(name))) << name;
    }
};

MARROWDALE_ON_EACH_FILE_SYSTEM(HistoryTest);

PropertyListDictionary decoded(const std::string& token) {
    const auto list = decodePropertyList(base64Decoded(token).value_or(Data()).bytes());
    const auto* dictionary = list ? list->as<PropertyListDictionary>() : nullptr;
    EXPECT_NE(dictionary, nullptr) << token;
    return dictionary ? *dictionary : PropertyListDictionary();
}

std::uint64_t eventOf(const std::string& token) {
    const auto fields = decoded(token);
    const auto field = fields.find("streamEventID");
    EXPECT_NE(field, fields.end());
    return field == fields.end() ? 0 : field->second.asUnsigned().value_or(0);
}

// The same token, as if it had been made at another event.
std::string withEvent(const std::string& token, std::uint64_t event) {
    PropertyListDictionary fields = decoded(token);
    fields.insert_or_assign("streamEventID", PropertyList(event));
    const auto bytes = encodePropertyList(PropertyList(std::move(fields)));
    EXPECT_TRUE(bytes.has_value());
    return bytes ? base64Encoded(bytes->bytes()) : std::string();
}

TEST_P(HistoryTest, aPageGoesOnInAnotherProcessWhenNothingWasDeleted) {
    makeFiles(450);
    makeFolder(home_.document("folder"));
    const std::string token = secondPage();
    write("made", "x");
    write("file 3", "changed");
    write("folder/made", "x");
    makeFolder(home_.document("folder/made too"));
    ASSERT_EQ(::chmod(home_.document("file 4").c_str(), 0600), 0);
    const Json next = page(token);
    EXPECT_EQ(next.at("items").size(), 200U);
    const std::uint64_t event = eventOf(text(next, "nextPage"));
    EXPECT_GT(event, eventOf(token)) << "the next page is good from what is newest now";
    EXPECT_THAT(logOf(token),
                HasSubstr("safe to resume gather phase from " + std::to_string(event) + "\n"));
}

TEST_P(HistoryTest, aPageHasExpiredWhenSomethingIsGoneSinceThen) {
    makeFiles(250);
    makeFolder(home_.document("folder"));
    makeFolder(home_.document("empty"));
    write("folder/deep", "x");
    makeFolder(home_.path("elsewhere"));
    const std::vector<Deed> deeds{
        {"file 0", [&] { remove("file 0"); }},
        {"file 1", [&] { rename("file 1", "another name"); }},
        {"file 2", [&] { rename("file 2", "folder/file 2"); }},
        {"file 3", [&] { rename("file 3", ".hidden"); }},
        {"file 4",
         [&] {
             std::filesystem::rename(home_.document("file 4"), home_.path("elsewhere/file 4"));
         }},
        {"folder/deep", [&] { remove("folder/deep"); }},
        {"empty", [&] { remove("empty"); }},
        {"folder", [&] { rename("folder", "renamed"); }},
    };
    for (const Deed& deed : deeds) {
        const std::string token = secondPage();
        deed.run();
        SCOPED_TRACE(deed.name);
        expectExpired(token);
        EXPECT_THAT(logOf(token), HasSubstr("deletion of " + home_.document(deed.name) +
                                            " requires to re-gather from scratch\n"));
        EXPECT_FALSE(page(secondPage()).at("items").empty()) << "a new listing goes on";
    }
}

TEST_P(HistoryTest, whatIsHiddenMayGoWithoutDisturbingAPage) {
    makeFiles(250);
    makeFolder(home_.document(".hidden/deeper"));
    write(".hidden/deeper/a", "x");
    write(".file", "x");
    makeFolder(home_.document(".Trash"));
    write(".Trash/old", "x");
    const std::string token = secondPage();
    std::filesystem::remove_all(home_.document(".hidden"));
    remove(".file");
    remove(".Trash/old");
    EXPECT_EQ(page(token).at("items").size(), 50U);
}

TEST_P(HistoryTest, aPageHasExpiredWhenTheStoreWasLostOrDamaged) {
    makeFiles(250);
    const std::string stores = home_.path(".local/state/marrowdale");
    const auto flipAByteOfEachHead = [&] {
        for (const auto& entry : std::filesystem::directory_iterator(stores)) {
            const std::string head = entry.path() / "head";
            if (std::filesystem::exists(head)) {
                std::string bytes = readFile(head);
                bytes[bytes.size() / 2] = static_cast<char>(bytes[bytes.size() / 2] ^ 1);
                writeFile(head, bytes);
            }
        }
    };
    const std::vector<Deed> deeds{{"damaged", flipAByteOfEachHead},
                                  {"removed", [&] { std::filesystem::remove_all(stores); }}};
    for (const Deed& deed : deeds) {
        const std::string token = secondPage();
        deed.run();
        SCOPED_TRACE(deed.name);
        expectExpired(token);
        EXPECT_THAT(logOf(token), HasSubstr("device UUID changed ("));
    }
}

TEST_P(HistoryTest, aPageFromTheFutureHasExpired) {
    makeFiles(250);
    const std::string token = secondPage();
    ASSERT_EQ(withEvent(token, eventOf(token)), token);
    const std::string future = withEvent(token, eventOf(token) + 1'000'000'000);
    expectExpired(future);
    EXPECT_THAT(logOf(future), HasSubstr("can't replay historical FSEvents, need to re-start "
                                         "gather phase from scratch\n"));
    EXPECT_EQ(page(token).at("items").size(), 50U);
}

// Each save is seen by the next run as its result alone.
TEST_P(HistoryTest, aSaveThatReplacesTheFileKeepsTheIdentifier) {
    const std::vector<Deed> saves{
        {"renamed over",
         [&] {
             write("doc.tmp", "new");
             rename("doc.tmp", "doc");
         }},
        {"backed up and written anew",
         [&] {
             rename("doc", "doc~");
             write("doc", "new");
             remove("doc~");
         }},
        {"with the back-up kept",
         [&] {
             rename("doc", "doc~");
             write("doc", "new");
         }},
        {"a hidden file renamed over",
         [&] {
             write(".goutputstream-1A2B3C", "new");
             rename(".goutputstream-1A2B3C", "doc");
         }},
        {"the same with a linked back-up",
         [&] {
             write(".goutputstream-1A2B3C", "new");
             std::filesystem::create_hard_link(home_.document("doc"), home_.document("doc~"));
             rename(".goutputstream-1A2B3C", "doc");
         }},
        {"renamed to a back-up and renamed in",
         [&] {
             write("sedAbCdEf", "new");
             rename("doc", "doc.bak");
             rename("sedAbCdEf", "doc");
         }},
    };
    for (const Deed& save : saves) {
        SCOPED_TRACE(save.name);
        write("doc", "old");
        const std::string identifier = home_.identifierOf("doc");
        ASSERT_TRUE(identifier.starts_with("did=")) << identifier;
        const auto file = home_.line({"info", identifier})["fileID"];
        save.run();
        EXPECT_EQ(home_.pathOf(identifier), home_.document("doc"));
        EXPECT_EQ(home_.identifierOf("doc"), identifier);
        EXPECT_EQ(readFile(home_.document("doc")), "new");
        EXPECT_NE(home_.line({"info", identifier})["fileID"], file);
        for (const char* name : {"doc", "doc~", "doc.bak"}) {
            if (std::filesystem::exists(home_.document(name))) {
                EXPECT_EQ(home_.identifierOf(name) == identifier, std::string_view(name) == "doc");
                remove(name);
            }
        }
    }
}

TEST_P(HistoryTest, aFileThatIsPutAsideUnderAnotherNameTakesItsIdentifierAlong) {
    write("doc", "old");
    const std::string identifier = home_.identifierOf("doc");
    rename("doc", "last year");
    write("doc", "new");
    EXPECT_EQ(home_.pathOf(identifier), home_.document("last year"));
    EXPECT_NE(home_.identifierOf("doc"), identifier);
}

TEST_P(HistoryTest, aListingUnderWhichThingsAreDeletedEndsWell) {
    constexpr int count = 2000;  // whose lines are more than a pipe holds
    makeFiles(count);
    makeFolder(home_.document("folder"));
    for (int i = 0; i < count; ++i) {
        write("folder/deep " + std::to_string(i), "");
    }
    std::set<std::string> staying;
    for (int i = 1; i < count; i += 2) {
        staying.insert("file " + std::to_string(i));
    }
    ChildProcess listing(home_.command({"--json", "ls", "root"}));
    ASSERT_FALSE(listing.readOutput(1, std::chrono::minutes(1)).empty());
    for (int i = 0; i < count; i += 2) {
        remove("file " + std::to_string(i));
    }
    std::filesystem::remove_all(home_.document("folder"));
    const ChildResult result = listing.finish();
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    EXPECT_EQ(result.errors, "");
    std::vector<std::string> names = field(parsedLines(result.output), "filename");
    std::ranges::sort(names);
    EXPECT_EQ(std::ranges::adjacent_find(names), names.end()) << "each is printed once";
    EXPECT_TRUE(std::ranges::includes(names, staying)) << "whatever stayed is printed";
}

}  // namespace
}  // namespace marrowdale::tests
