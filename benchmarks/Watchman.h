#pragma once

#include <string>
#include <sys/types.h>

#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::benchmarks {

// A watchman of our own, with its socket and files in a folder of its own, so that none that runs
// on the machine is touched; and one client of it, which speaks its JSON. One thread. What goes
// wrong throws.
class Watchman {
  public:
    Watchman();
    // Ends it.
    ~Watchman();
    Watchman(const Watchman&) = delete;
    Watchman& operator=(const Watchman&) = delete;

    // Returns when the tree is crawled and watched.
    void watch(const std::string& folder);
    void forget(const std::string& folder);
    // Where it stands, once it has seen everything that was done before.
    [[nodiscard]] std::string clock(const std::string& folder);
    // What changed since that clock, by name or with all that it knows: how many bytes of answer
    // that is. Throws when the answer is that everything may have changed.
    enum class Fields { names, status };
    std::size_t since(const std::string& folder, const std::string& clock,
                      Fields fields = Fields::names);
    // From then on `waitForChange` returns with the next thing that it tells.
    void subscribe(const std::string& folder);
    void unsubscribe(const std::string& folder);
    // Until it tells of a file with that in its name.
    void waitForChange(const std::string& name);

    // Its resident memory, in bytes.
    [[nodiscard]] double memory() const;

  private:
    [[nodiscard]] bool connect();
    // The answer, without what subscriptions tell meanwhile.
    std::string ask(const std::string& command);
    [[nodiscard]] std::string readLine();

    std::string folder_;
    pid_t process_ = 0;
    native::UniqueFD socket_;
    std::string rest_;  // read, behind the last line
};

}  // namespace marrowdale::benchmarks
