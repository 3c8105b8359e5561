#include "benchmarks/Measurement.h"

#include <algorithm>
#include <cstddef>
#include <stdexcept>
#include <utility>

namespace marrowdale::benchmarks {
namespace {

template <typename T>
T middle(std::vector<T> values) {
    if (values.empty()) {
        throw std::logic_error("nothing was measured");
    }
    const auto half = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), half, values.end());
    return *half;
}

}  // namespace

void Contest::addForRounds(std::string name, int rounds, Contestant contestant) {
    entries_.push_back({std::move(name), rounds, std::move(contestant), {}});
}

void Contest::run(int rounds) {
    for (int round = 0; round < rounds; ++round) {
        for (Entry& entry : entries_) {
            if (round < entry.rounds) {
                entry.results.push_back(entry.contestant());
            }
        }
    }
}

Duration Contest::median(const std::string& name) const {
    return middle(entry(name).results);
}

double Contest::ratio(const std::string& name, const std::string& to) const {
    const Entry& upper = entry(name);
    const Entry& lower = entry(to);
    std::vector<double> ratios;
    for (std::size_t round = 0; round < std::min(upper.results.size(), lower.results.size());
         ++round) {
        ratios.push_back(upper.results[round] / lower.results[round]);
    }
    return middle(std::move(ratios));
}

const Contest::Entry& Contest::entry(const std::string& name) const {
    const auto found = std::find_if(entries_.begin(), entries_.end(),
                                    [&](const Entry& entry) { return entry.name == name; });
    if (found == entries_.end()) {
        throw std::logic_error("no contestant " + name);
    }
    return *found;
}

}  // namespace marrowdale::benchmarks
