#include "tests/powerloss/PowerCuts.h"

#include <algorithm>
#include <span>

namespace marrowdale::tests {

PowerCuts::PowerCuts(const MemoryFile& before, const WriteLog& log, std::size_t atom)
    : before_(before), log_(log), atom_(atom), entries_(log.entries()), lasting_(before.copy()) {}

std::size_t PowerCuts::lastFlushBefore(std::size_t position) const {
    while (position > 0 && entries_[position - 1].kind != WriteLog::Entry::Kind::flush) {
        --position;
    }
    return position;
}

void PowerCuts::apply(const WriteLog::Entry& entry, MemoryFile& disk) const {
    disk.write(log_.contents(entry), entry.offset);
}

void PowerCuts::tear(const WriteLog::Entry& entry, MemoryFile& disk, std::mt19937& random) const {
    const auto bytes = log_.contents(entry);
    for (std::size_t at = 0; at < bytes.size(); at += atom_) {
        if (random() % 2 == 0) {
            const auto part = std::span(bytes).subspan(at, std::min(atom_, bytes.size() - at));
            disk.write(part, entry.offset + at);
        }
    }
}

void PowerCuts::applyUpTo(std::size_t position) {
    if (position < applied_) {
        lasting_ = before_.copy();
        applied_ = 0;
    }
    for (; applied_ < position; ++applied_) {
        apply(entries_[applied_], lasting_);
    }
}

MemoryFile PowerCuts::at(std::size_t position, std::uint32_t seed) {
    const std::size_t flushed = lastFlushBefore(position);
    applyUpTo(flushed);
    MemoryFile disk = lasting_.copy();
    std::mt19937 random(seed);
    // Often nothing of the late writes arrives, or everything, or a mixture.
    constexpr std::uint32_t moods = 4;
    const std::uint32_t mood = random() % moods;
    for (std::size_t i = flushed; i < position; ++i) {
        const auto fate = mood < 2 ? Fate{static_cast<std::uint8_t>(mood)}
                                   : Fate{static_cast<std::uint8_t>(random() % 3)};
        if (fate == Fate::whole) {
            apply(entries_[i], disk);
        } else if (fate == Fate::torn) {
            tear(entries_[i], disk, random);
        }
    }
    return disk;
}

}  // namespace marrowdale::tests
