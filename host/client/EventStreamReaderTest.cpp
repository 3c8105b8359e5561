#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/client/EventStreamReader.h"

namespace marrowdale::host {
namespace {

using ::testing::ElementsAre;

using Events = std::vector<std::pair<std::string, std::string>>;

Events eventsOf(std::string_view text, std::size_t pieceSize) {
    Events events;
    EventStreamReader reader(
        [&](std::string_view name, std::string_view data) { events.emplace_back(name, data); });
    for (; !text.empty(); text.remove_prefix(std::min(pieceSize, text.size()))) {
        reader.take(text.substr(0, pieceSize));
    }
    return events;
}

TEST(EventStreamReaderTest, eventsAreTheSameWhereverTheStreamIsCut) {
    constexpr std::string_view text =
        ": a comment\n\nevent: signal\ndata: {\"a\":1}\n\ndata:one\ndata: two\r\n\r\n"
        "event: nothing\n\nid: 7\nevent:last\ndata\n\nevent: cut off\ndata: x";
    for (std::size_t size = 1; size <= text.size(); ++size) {
        EXPECT_THAT(eventsOf(text, size),
                    ElementsAre(std::pair("signal", "{\"a\":1}"), std::pair("message", "one\ntwo"),
                                std::pair("last", "")))
            << size;
    }
}

}  // namespace
}  // namespace marrowdale::host
