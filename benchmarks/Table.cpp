#include "benchmarks/Table.h"

#include <array>
#include <cmath>
#include <ostream>
#include <string_view>
#include <utility>

#include <fmt/format.h>

namespace marrowdale::benchmarks {
namespace {

std::string verdict(const Table::Row& row) {
    if (!row.target) {
        return "";
    }
    return row.ratio <= *row.target ? "met" : "**missed**";
}

}  // namespace

void Table::add(Row row) {
    if (targets_ == Targets::leftOut) {
        row.target.reset();
    }
    rows_.push_back(std::move(row));
}

void Table::heading(std::string text) {
    note("**" + std::move(text) + "**");
}

void Table::note(std::string text) {
    rows_.push_back(
        {.what = std::move(text), .measured = {}, .against = {}, .ratio = 0, .target = {}});
}

void Table::print(std::ostream& stream) const {
    stream << "| what | measured | against | ratio | target | |\n|---|---|---|---|---|---|\n";
    for (const Row& row : rows_) {
        if (row.measured.empty()) {
            stream << "| " << row.what << " | | | | | |\n";
            continue;
        }
        stream << fmt::format("| {} | {} | {} | {:.2f} | {} | {} |\n", row.what, row.measured,
                              row.against, row.ratio,
                              row.target ? fmt::format("{:.1f}", *row.target) : "", verdict(row));
    }
}

std::string inWords(double seconds) {
    constexpr std::array<std::pair<double, std::string_view>, 3> units{
        {{1.0, "s"}, {1e-3, "ms"}, {1e-6, "µs"}}};
    for (const auto& [unit, name] : units) {
        if (seconds >= unit) {
            return fmt::format("{:.2f} {}", seconds / unit, name);
        }
    }
    return fmt::format("{:.0f} ns", seconds * 1e9);
}

std::string each(double seconds, double count) {
    return fmt::format("{:.0f} ns", std::round(seconds * 1e9 / count));
}

}  // namespace marrowdale::benchmarks
