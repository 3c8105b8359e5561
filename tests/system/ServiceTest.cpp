#include <algorithm>
#include <csignal>
#include <filesystem>
#include <set>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <gmock/gmock.h>

#include "host/client/HttpConnection.h"
#include "platform/foundation/Base64.h"
#include "tests/system/Service.h"
#include "tests/system/SystemTest.h"

namespace marrowdale::tests {
namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

class ServiceTest : public ::testing::Test {
  protected:
    [[nodiscard]] std::string state() const { return home_.path(".local/state/marrowdale"); }
    [[nodiscard]] std::string anchor(const std::string& item) const {
        return text(home_.line({"anchor", item}), "anchor");
    }
    [[nodiscard]] Json changes(const std::string& item, const std::string& since) const {
        return home_.line({"changes", item, "--since", since});
    }
    Home home_;
};

std::vector<std::string> names(const Json& items) {
    std::vector<std::string> all;
    for (const Json& item : items) {
        all.push_back(item.at("filename"));
    }
    return all;
}

Arguments inForm(Arguments command, bool asJson) {
    if (asJson) {
        command.insert(command.begin(), "--json");
    }
    return command;
}

std::string_view lastLine(std::string_view text) {
    const std::size_t end = text.find_last_of('\n');
    const std::size_t begin = end == 0 ? 0 : text.find_last_of('\n', end - 1) + 1;
    return end == std::string_view::npos ? text : text.substr(begin, end - begin);
}

TEST_F(ServiceTest, commandsAnswerThroughItAsTheyDoWithoutIt) {
    makeFolder(home_.document("folder"));
    writeFile(home_.document("folder/inner.txt"), "inner");
    writeFile(home_.document("bytes \xFF\n.txt"), "x");
    for (int i = 0; i < 250; ++i) {
        writeFile(home_.document("many " + std::to_string(i)), "");
    }
    const std::string folder = home_.identifierOf("folder");
    const std::vector<Arguments> commands{{"ls"},
                                          {"ls", folder},
                                          {"info", folder},
                                          {"info", home_.document("bytes \xFF\n.txt")},
                                          {"id", "./folder"},
                                          {"path", folder},
                                          {"page", "root", "--page", "date"},
                                          {"ls", "all-directories"},
                                          {"info", "did=999999"},
                                          {"ls", home_.document("folder/inner.txt")},
                                          {"page", "root", "--page", "AAAA"},
                                          {"path", "nonsense"},
                                          {"info", "./none"},
                                          {"changes", "root", "--since", "AAAA"}};
    for (const bool asJson : {true, false}) {
        std::vector<ChildResult> without;
        for (const Arguments& command : commands) {
            without.push_back(home_.run(inForm(command, asJson)));
        }
        const Service service(home_);
        for (std::size_t i = 0; i < commands.size(); ++i) {
            const Arguments command = inForm(commands[i], asJson);
            const ChildResult with = home_.run(command);
            EXPECT_EQ(with.exitCode, without[i].exitCode) << ::testing::PrintToString(command);
            // Log lines are the service's own.
            EXPECT_EQ(lastLine(with.errors), lastLine(without[i].errors));
            if (commands[i][0] != "page") {
                EXPECT_EQ(with.output, without[i].output);
            }
        }
    }
}

TEST_F(ServiceTest, itSaysWhatItServesOnceItIsReady) {
    Service service(home_);
    EXPECT_EQ(parsedLine(service.ready()).at("serving"), home_.root());
    EXPECT_EQ(std::filesystem::status(state() + "/socket").permissions(),
              std::filesystem::perms::owner_read | std::filesystem::perms::owner_write);
    const auto begun = std::chrono::steady_clock::now();
    const ChildResult result = service.end();
    EXPECT_LT(std::chrono::steady_clock::now() - begun, seconds(1));
    EXPECT_EQ(result.exitCode, 0);
    EXPECT_EQ(result.errors, "");
    EXPECT_FALSE(std::filesystem::exists(state() + "/socket"));
}

TEST_F(ServiceTest, changesAreFollowedFromAnAnchorWithAndWithoutIt) {
    writeFile(home_.document("old.txt"), "old");
    const std::string old = home_.identifierOf("old.txt");
    const std::string first = anchor("root");
    writeFile(home_.document("a.txt"), "a");
    const Json without = changes("root", first);
    EXPECT_THAT(names(without.at("updated")), ElementsAre("a.txt"));
    EXPECT_EQ(without.at("moreComing"), false);
    const Service service(home_);
    EXPECT_THAT(names(changes("root", first).at("updated")), ElementsAre("a.txt"));
    writeFile(home_.document("b.txt"), "b");
    std::filesystem::remove(home_.document("old.txt"));
    const Json second = changes("root", text(without, "anchor"));
    EXPECT_THAT(names(second.at("updated")), ElementsAre("b.txt"));
    EXPECT_THAT(second.at("deleted").get<std::vector<std::string>>(), ::testing::Contains(old));
    const Json third = changes("root", text(second, "anchor"));
    EXPECT_THAT(third.at("updated"), IsEmpty());
    EXPECT_THAT(third.at("deleted"), IsEmpty());
    EXPECT_EQ(text(third, "anchor"), text(second, "anchor"));
}

TEST_F(ServiceTest, changesComeInBatchesOfTwoHundred) {
    const std::string first = anchor("root");
    for (int i = 0; i < 450; ++i) {
        writeFile(home_.document(std::to_string(i)), "");
    }
    const std::vector<Json> batches = home_.lines({"changes", "root", "--since", first, "--all"});
    ASSERT_EQ(batches.size(), 3U);
    std::set<std::string> seen;
    for (std::size_t i = 0; i < batches.size(); ++i) {
        EXPECT_EQ(batches[i].at("moreComing"), i < 2);
        for (const std::string& name : names(batches[i].at("updated"))) {
            seen.insert(name);
        }
    }
    EXPECT_EQ(seen.size(), 450U);
}

TEST_F(ServiceTest, watchTellsOfEveryChangeUntilItIsInterrupted) {
    for (const bool isServed : {true, false}) {
        std::optional<Service> service;
        if (isServed) {
            service.emplace(home_);
        }
        ChildProcess watch(home_.command({"--json", "watch"}));
        if (!isServed) {
            // It is the service itself; its socket is there once it listens.
            while (!host::HttpConnection::open(state())) {
                std::this_thread::yield();
            }
        }
        const std::string before = anchor("root");
        writeFile(home_.document(isServed ? "one" : "two"), "");
        std::string output;
        for (std::size_t size = 1; !output.contains("RootContainer"); size = output.size() + 1) {
            const std::string more = watch.readOutput(size, patience);
            ASSERT_GE(more.size(), size) << "no signal";
            output = more;
        }
        for (const Json& line : parsedLines(output)) {
            EXPECT_THAT(line.at("signal"),
                        ::testing::AnyOf("VantrelRootContainerItemIdentifier",
                                         "VantrelWorkingSetContainerItemIdentifier"));
        }
        EXPECT_THAT(names(changes("root", before).at("updated")),
                    ElementsAre(isServed ? "one" : "two"));
        ::kill(watch.number(), SIGINT);
        const ChildResult result = watch.finish();
        EXPECT_EQ(result.exitCode, 0) << result.errors;
        EXPECT_EQ(result.errors, "");
    }
}

TEST_F(ServiceTest, whoWatchesIsToldOfWhatSomebodyElseDoesInTheTrash) {
    makeFolder(home_.document(".Trash"));
    const Service service(home_);
    ChildProcess watch(home_.command({"--json", "watch"}));
    std::string output;
    int made = 0;
    // When it has begun to watch it does not say.
    EXPECT_TRUE(waitUntil([&] {
        writeFile(home_.document(".Trash/" + std::to_string(++made)), "");
        constexpr std::chrono::seconds aWhile{2};
        output = watch.readOutput(output.size() + 1, aWhile);
        return output.contains("WorkingSet");
    }));
    EXPECT_FALSE(output.contains("RootContainer")) << "the documents are what they were";
}

TEST_F(ServiceTest, aSecondServiceIsRefusedAndSaysWhoServes) {
    Service service(home_);
    const Json error = home_.error({"serve"}, 3);
    EXPECT_THAT(text(error, "message"), HasSubstr("process " + std::to_string(service.number())));
    EXPECT_EQ(service.end().exitCode, 0);
}

TEST_F(ServiceTest, whatAKilledServiceLeftIsNoObstacle) {
    writeFile(home_.document("a"), "");
    std::string identifier;
    {
        Service service(home_);
        identifier = home_.identifierOf("a");
        service.kill();
    }
    EXPECT_TRUE(std::filesystem::exists(state() + "/socket"));
    EXPECT_EQ(home_.identifierOf("a"), identifier);
    Service again(home_);
    EXPECT_EQ(home_.identifierOf("a"), identifier);
    EXPECT_EQ(again.end().exitCode, 0);
}

TEST_F(ServiceTest, aStateFolderWithALongPathIsServed) {
    const std::string deep = home_.path(std::string(100, 'x') + "/" + std::string(100, 'y'));
    Service service(home_, {"--json", "--state", deep, "serve"});
    EXPECT_EQ(home_.line({"--state", deep, "info", "root"}).at("isFolder"), true);
    EXPECT_EQ(service.end(SIGINT).exitCode, 0);
}

// A client that speaks bytes.
native::UniqueFD connected(const std::string& state) {
    native::UniqueFD client(::socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    const std::string path = state + "/socket";
    std::ranges::copy(path, std::begin(address.sun_path));
    EXPECT_EQ(::connect(client.get(), reinterpret_cast<sockaddr*>(&address), sizeof address), 0);
    return client;
}

void say(const native::UniqueFD& client, std::string_view text) {
    EXPECT_EQ(::send(client.get(), text.data(), text.size(), MSG_NOSIGNAL),
              static_cast<ssize_t>(text.size()));
}

std::size_t openDescriptors(pid_t process) {
    const std::filesystem::directory_iterator descriptors("/proc/" + std::to_string(process) +
                                                          "/fd");
    return static_cast<std::size_t>(std::distance(begin(descriptors), end(descriptors)));
}

TEST_F(ServiceTest, clientsThatGoOrNeverReadKeepNobodyWaitingAndLeaveNothing) {
    for (int i = 0; i < 1000; ++i) {
        writeFile(home_.document(std::to_string(i)), "");
    }
    Service service(home_);
    EXPECT_EQ(home_.lines({"ls"}).size(), 1000U);
    const std::size_t before = openDescriptors(service.number());
    {
        std::vector<native::UniqueFD> clients;
        for (int i = 0; i < 100; ++i) {
            clients.push_back(connected(state()));
            // Half of them ask for pages that they never read, the others for signals.
            for (int j = 0; j < 20 && i % 2 == 0; ++j) {
                say(clients.back(),
                    "GET /v1/items/VantrelRootContainerItemIdentifier/children "
                    "HTTP/1.1\r\nHost: x\r\n\r\n");
            }
            if (i % 2 == 1) {
                say(clients.back(),
                    "GET /v1/signals?container=VantrelRootContainerItemIdentifier "
                    "HTTP/1.1\r\nHost: x\r\n\r\n");
            }
        }
        // Half a request.
        clients.push_back(connected(state()));
        say(clients.back(), "GET /v1/items/x HT");
        EXPECT_EQ(home_.lines({"ls"}).size(), 1000U);
        writeFile(home_.document("1"), "changed");
        EXPECT_EQ(home_.line({"info", "./1"}).at("documentSize"), 7);
    }
    const auto deadline = std::chrono::steady_clock::now() + patience;
    while (openDescriptors(service.number()) > before &&
           std::chrono::steady_clock::now() < deadline) {
        std::this_thread::yield();
    }
    EXPECT_LE(openDescriptors(service.number()), before);
    EXPECT_EQ(service.end().exitCode, 0);
}

TEST_F(ServiceTest, whatIsNoRequestIsAnsweredAsOne) {
    Service service(home_);
    const auto connection = host::HttpConnection::open(state());
    ASSERT_TRUE(connection.has_value());
    const std::vector<std::pair<host::HttpRequest, unsigned>> requests{
        {{.target = "/"}, 404},
        {{.target = "/v1/nothing"}, 404},
        {{.target = "/v1/items/did%3D1"}, 404},
        {{.target = "/v1/items/%ZZ"}, 400},
        {{.target = "/v1/lookup"}, 400},
        {{.target = "/v1/lookup?path=relative"}, 400},
        {{.target = "/v1/items/VantrelRootContainerItemIdentifier/children?page=%21"}, 400},
        {{.target = "/v1/items/VantrelRootContainerItemIdentifier/changes"}, 400},
        {{.target = "/v1/items/VantrelRootContainerItemIdentifier/changes?since=AAAA"}, 410},
        {{.method = "DELETE", .target = "/v1/items/did%3D1"}, 405},
        {{.target = "/v1/service"}, 200}};
    for (const auto& [request, status] : requests) {
        const auto answer = (*connection)->send(request);
        ASSERT_TRUE(answer.has_value()) << request.target;
        EXPECT_EQ(answer->status, status) << request.target << answer->body;
        EXPECT_EQ(Json::parse(answer->body).contains("error"), status != 200);
    }
    const auto tooLong = (*connection)->send({.target = "/" + std::string(100'000, 'x')});
    EXPECT_TRUE(!tooLong || tooLong->status == 400);
    EXPECT_EQ(home_.line({"info", "root"}).at("isFolder"), true);
    EXPECT_EQ(service.end().exitCode, 0);
}

TEST_F(ServiceTest, namesAndTagsAreSearchedWithAndWithoutIt) {
    makeFolder(home_.document("Reports"));
    writeFile(home_.document("Reports/annual report 2026.txt"), "");
    writeFile(home_.document("Reports/it's \"quoted\" \xFF"), "");
    writeFile(home_.document("other"), "");
    const auto search = [&](const Arguments& words) {
        Arguments arguments{"search"};
        arguments.insert(arguments.end(), words.begin(), words.end());
        return field(home_.lines(arguments), "filename");
    };
    for (const bool isServed : {false, true}) {
        std::optional<Service> service;
        if (isServed) {
            service.emplace(home_);
        }
        EXPECT_THAT(search({"REPORT"}), UnorderedElementsAre("Reports", "annual report 2026.txt"));
        EXPECT_THAT(search({"report", "20"}), ElementsAre("annual report 2026.txt"));
        EXPECT_THAT(search({"\"quoted\""}), ElementsAre("it's \"quoted\" \xFF"));
        EXPECT_THAT(search({"nothing like it"}), IsEmpty());
        const std::string name = isServed ? "served" : "alone";
        writeFile(home_.document(name), "");
        EXPECT_THAT(search({name}), ElementsAre(name));
        std::filesystem::rename(home_.document(name), home_.document("x" + name));
        EXPECT_THAT(search({name}), ElementsAre("x" + name));
        std::filesystem::remove(home_.document("x" + name));
        EXPECT_THAT(search({name}), IsEmpty());
    }
}

TEST_F(ServiceTest, aDamagedSearchIndexIsMadeAnew) {
    writeFile(home_.document("found"), "");
    ASSERT_EQ(home_.lines({"search", "found"}).size(), 1U);
    for (const char* junk : {"", "no database", "SQLite format 3"}) {
        writeFile(state() + "/replica.sqlite", junk);
        EXPECT_EQ(home_.lines({"search", "found"}).size(), 1U) << junk;
    }
}

TEST_F(ServiceTest, theExampleOfTheClientLibraryFollowsWhatHappens) {
    writeFile(home_.document("old"), "");
    Service service(home_);
    ChildOptions options = home_.command({});
    options.arguments = {programFolder() + "/marrowdale_example_follow"};
    ChildProcess example(options);
    const auto readUntil = [&](const std::string& wanted) {
        std::string output;
        while (!output.contains(wanted)) {
            const std::string more = example.readOutput(output.size() + 1, patience);
            if (more.size() <= output.size()) {
                break;
            }
            output = more;
        }
        return output;
    };
    EXPECT_THAT(readUntil("now 1 items\n"), HasSubstr("now 1 items\n"));
    writeFile(home_.document("new"), "");
    EXPECT_THAT(readUntil("now 2 items\n"), HasSubstr("changed " + home_.document("new")));
    std::filesystem::remove(home_.document("old"));
    EXPECT_THAT(readUntil("gone "), HasSubstr("gone " + home_.document("old")));
    EXPECT_EQ(service.end().exitCode, 0);
    const ChildResult result = example.finish();
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_THAT(result.errors, HasSubstr("Connection reset"));
}

TEST_F(ServiceTest, whatWasAnsweredIsThereAfterAKill) {
    std::string identifier;
    {
        Service service(home_);
        writeFile(home_.document("a"), "");
        identifier = home_.identifierOf("a");
        std::filesystem::rename(home_.document("a"), home_.document("b"));
        EXPECT_EQ(home_.pathOf(identifier), home_.document("b"));
        service.kill();
    }
    EXPECT_EQ(home_.pathOf(identifier), home_.document("b"));
}

}  // namespace
}  // namespace marrowdale::tests
