// The disk whose writes are logged, and the power cuts that are made from its log.

#include <algorithm>
#include <array>
#include <fcntl.h>
#include <filesystem>
#include <set>
#include <string_view>
#include <unistd.h>
#include <vector>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/linux/files/UniqueFD.h"
#include "platform/testing/TestFiles.h"
#include "tests/powerloss/PowerCuts.h"
#include "tests/powerloss/PowerLossTestBase.h"

namespace marrowdale::tests {
namespace {

using Kind = WriteLog::Entry::Kind;

constexpr std::size_t sector = 512;

std::vector<std::byte> filled(char with, std::size_t size) {
    return std::vector<std::byte>(size, static_cast<std::byte>(with));
}

std::string textAt(const MemoryFile& disk, std::uint64_t offset, std::size_t size) {
    std::string text(size, '\0');
    disk.read(std::as_writable_bytes(std::span(text)), offset);
    return text;
}

TEST(PowerCutsTest, WhatWasFlushedIsThereAndNothingOfTheFutureIs) {
    const MemoryFile before(4 * sector);
    WriteLog log;
    log.addWrite(filled('a', sector), 0);
    log.addFlush();
    log.addWrite(filled('b', sector), sector);
    log.addFlush();
    log.addWrite(filled('c', sector), 0);
    PowerCuts cuts(before, log, sector);
    for (std::uint32_t seed = 0; seed < 20; ++seed) {
        EXPECT_EQ(textAt(cuts.at(4, seed), 0, 1), "a");
        EXPECT_EQ(textAt(cuts.at(4, seed), sector, 1), "b");
        EXPECT_EQ(textAt(cuts.at(2, seed), sector, 1), std::string(1, '\0')) << "went back";
    }
}

TEST(PowerCutsTest, OfLateWritesAnyPartMayBeThere) {
    const MemoryFile before(4 * sector);
    WriteLog log;
    log.addWrite(filled('a', 2 * sector), 0);
    log.addWrite(filled('b', sector), 2 * sector);
    PowerCuts cuts(before, log, sector);
    std::set<std::string> seen;
    for (std::uint32_t seed = 0; seed < 200; ++seed) {
        const MemoryFile disk = cuts.at(2, seed);
        std::string found;
        for (const std::uint64_t at : {std::uint64_t{0}, std::uint64_t{sector}, 2 * sector}) {
            const std::string text = textAt(disk, at, sector);
            ASSERT_EQ(text, std::string(sector, text[0])) << "a sector is whole or not there";
            found += text[0] == '\0' ? '-' : text[0];
        }
        seen.insert(found);
    }
    EXPECT_THAT(seen, testing::UnorderedElementsAre("---", "aa-", "--b", "aab", "a--", "-a-", "a-b",
                                                    "-ab"));
}

TEST(PowerCutsTest, TheSameSeedMakesTheSameDisk) {
    const MemoryFile before(64 * sector);
    WriteLog log;
    log.addWrite(filled('a', 64 * sector), 0);
    PowerCuts cuts(before, log, sector);
    for (std::uint32_t seed = 0; seed < 20; ++seed) {
        EXPECT_EQ(textAt(cuts.at(1, seed), 0, 64 * sector),
                  textAt(cuts.at(1, seed), 0, 64 * sector));
    }
}

class LoggedImageTest : public PowerLossTestBase {};

TEST_F(LoggedImageTest, LogsWritesAndFlushesInTheirOrder) {
    MemoryFile contents(1U << 20U);
    contents.write(filled('x', 1), 5);
    const LoggedImage image(imageFolder(), contents);
    const native::UniqueFD file(::open(image.path().c_str(), O_RDWR | O_CLOEXEC));
    ASSERT_TRUE(file);
    char byte = 0;
    ASSERT_EQ(::pread(file.get(), &byte, 1, 5), 1);
    EXPECT_EQ(byte, 'x');
    EXPECT_EQ(image.log().size(), 0U);
    ASSERT_EQ(::pwrite(file.get(), "first", 5, 1000), 5);
    ASSERT_EQ(::fsync(file.get()), 0);
    ASSERT_EQ(::pwrite(file.get(), "second", 6, 10), 6);
    const auto entries = image.log().entries();
    ASSERT_EQ(entries.size(), 3U);
    EXPECT_EQ(entries[0].kind, Kind::write);
    EXPECT_EQ(entries[0].offset, 1000U);
    EXPECT_EQ(image.log().contents(entries[0]).size(), 5U);
    EXPECT_EQ(entries[1].kind, Kind::flush);
    EXPECT_EQ(entries[2].offset, 10U);
    EXPECT_EQ(contents.copy().size(), contents.size());
}

class LoggedDiskTest : public PowerLossTestBase, public testing::WithParamInterface<DiskFormat> {};

TEST_P(LoggedDiskTest, WhatWasSyncedIsThereAfterEachPowerCut) {
    MARROWDALE_SKIP_WITHOUT(GetParam());
    const MemoryFile fresh = GetParam().make();
    const LoggedImage image(imageFolder(), fresh);
    struct Synced {
        std::size_t position;
        std::string name;
    };
    std::vector<Synced> synced;
    {
        const auto disk = mount(image.path(), GetParam());
        ASSERT_TRUE(disk);
        for (int i = 0; i < 20; ++i) {
            const std::string name = "/f" + std::to_string(i);
            writeFile(diskFolder() + name, name);
            const native::UniqueFD file(
                ::open((diskFolder() + name).c_str(), O_RDONLY | O_CLOEXEC));
            ASSERT_EQ(::fsync(file.get()), 0);
            synced.push_back({image.log().size(), name});
        }
    }
    PowerCuts cuts(fresh, image.log(), GetParam().atom);
    for (const std::uint32_t last : {0U, 5U, 19U}) {
        const MemoryFile cut = cuts.at(synced[last].position, last);
        const auto disk = mount(cut.path(), GetParam());
        ASSERT_TRUE(disk);
        for (std::size_t i = 0; i <= last; ++i) {
            EXPECT_EQ(readFile(diskFolder() + synced[i].name), synced[i].name);
        }
        EXPECT_FALSE(std::filesystem::exists(diskFolder() + "/f" + std::to_string(last + 2)))
            << "that was made after the power cut";
    }
}

INSTANTIATE_TEST_SUITE_P(OnEach, LoggedDiskTest, testing::ValuesIn(diskFormats()), diskFormatName);

}  // namespace
}  // namespace marrowdale::tests
