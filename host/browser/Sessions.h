#pragma once

#include <cstdint>
#include <deque>
#include <optional>
#include <stop_token>
#include <string>
#include <string_view>
#include <vector>

#include "platform/foundation/Date.h"
#include "platform/foundation/Mutex.h"

namespace marrowdale::host {

// Who may use the document browser: web browsers that came with a launch token, each of which is
// good for one session.
//
// Sessions are kept in memory alone and end with the process: while no service runs, anybody may
// listen at its port, and what a web browser tells him must be good for nothing afterwards. Any
// thread.
class Sessions {
  public:
    static constexpr std::size_t mostLaunches = 16;
    static constexpr std::size_t mostSessions = 64;

    // A token that begins one session. The oldest of too many is forgotten.
    [[nodiscard]] std::string newLaunch();

    struct Session {
        std::uint64_t number = 0;
        std::string token;   // a secret
        std::string client;  // what the web browser calls itself
        Date begun;
        Date lastUsed;
    };
    // Begins a session, for which the launch token is used up; none for a token that is not known,
    // or was used. The session unused for longest goes when there are too many.
    [[nodiscard]] std::optional<Session> begin(std::string_view launch, std::string_view client);

    // The session that a token belongs to; it counts as used.
    [[nodiscard]] std::optional<std::uint64_t> numberOf(std::string_view token);
    // Asked for a stop when the session ends; at once for one that is not there.
    [[nodiscard]] std::stop_token endOf(std::uint64_t number);
    [[nodiscard]] bool has(std::uint64_t number);

    // In the order of their beginnings.
    [[nodiscard]] std::vector<Session> all();
    // False where there is none of that number.
    bool end(std::uint64_t number);

  private:
    struct Entry {
        Session session;
        std::stop_source ending;
    };
    void endUnusedForLongest() MARROWDALE_REQUIRES(mutex_);

    Mutex mutex_;
    std::deque<std::string> launches_ MARROWDALE_GUARDED_BY(mutex_);
    std::vector<Entry> entries_ MARROWDALE_GUARDED_BY(mutex_);
    std::uint64_t lastNumber_ MARROWDALE_GUARDED_BY(mutex_) = 0;
};

}  // namespace marrowdale::host
