#pragma once

#include <cstdint>
#include <string>
#include <string_view>

namespace marrowdale::host {

enum class FindingStatus : std::uint8_t {
    ok,
    note,     // works, but costs something or is switched off
    problem,  // does not work
};

// "ok", "note", "problem".
[[nodiscard]] constexpr std::string_view statusName(FindingStatus status) {
    switch (status) {
        case FindingStatus::ok:
            return "ok";
        case FindingStatus::note:
            return "note";
        case FindingStatus::problem:
            break;
    }
    return "problem";
}

// One thing that a look at the machine brought. Texts may hold any bytes of paths.
struct Finding {
    std::string name;  // stable, for machines
    FindingStatus status = FindingStatus::ok;
    std::string message;
    std::string advice;  // what to do about it; empty where there is nothing to do
};

}  // namespace marrowdale::host
