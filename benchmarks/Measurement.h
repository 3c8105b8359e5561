#pragma once

#include <chrono>
#include <functional>
#include <limits>
#include <string>
#include <utility>
#include <vector>

namespace marrowdale::benchmarks {

using Duration = std::chrono::duration<double>;  // seconds

// How long the call takes.
template <typename Call>
[[nodiscard]] Duration timed(Call&& call) {
    const auto start = std::chrono::steady_clock::now();
    call();
    return std::chrono::steady_clock::now() - start;
}

// Several ways to do the same, measured in turn, round by round, so that a machine that grows
// slower or faster meanwhile does so for all of them.
class Contest {
  public:
    // Measures itself, so that what has to be prepared for a round is not counted.
    using Contestant = std::function<Duration()>;

    void add(std::string name, Contestant contestant) {
        addForRounds(std::move(name), everyRound, std::move(contestant));
    }
    // Takes part in the first rounds only: for what is too slow to be waited for again and again.
    void addForRounds(std::string name, int rounds, Contestant contestant);
    void run(int rounds);

    // The middle of what a contestant took.
    [[nodiscard]] Duration median(const std::string& name) const;
    // The middle of the ratios of the rounds in which both took part.
    [[nodiscard]] double ratio(const std::string& name, const std::string& to) const;

  private:
    static constexpr int everyRound = std::numeric_limits<int>::max();
    struct Entry {
        std::string name;
        int rounds = everyRound;
        Contestant contestant;
        std::vector<Duration> results;  // one a round
    };
    [[nodiscard]] const Entry& entry(const std::string& name) const;

    std::vector<Entry> entries_;
};

}  // namespace marrowdale::benchmarks
