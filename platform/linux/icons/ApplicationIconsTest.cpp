#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <functional>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "platform/linux/icons/ApplicationIcons.h"
#include "platform/linux/icons/BuiltInIcon.h"
#include "platform/linux/icons/CachedBitmap.h"
#include "platform/linux/icons/PNG.h"
#include "platform/testing/ScopedMount.h"
#include "platform/testing/TemporaryDirectory.h"
#include "platform/testing/TestFiles.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

namespace fs = std::filesystem;

using Pixel = std::array<int, 4>;
constexpr Pixel red{255, 0, 0, 255};
constexpr Pixel green{0, 255, 0, 255};
constexpr Pixel clear{0, 0, 0, 0};

std::string program() {
    return programFolder() + "/../libexec/marrowdale/marrowdale-render-icon";
}

std::string svg(std::string_view colour) {
    return "<svg xmlns=\"http://www.w3.org/2000/svg\" width=\"8\" height=\"8\">"
           "<rect width=\"8\" height=\"8\" fill=\"" +
           std::string(colour) + "\"/></svg>";
}

std::string png(std::uint32_t width, std::uint32_t height, const Pixel& colour) {
    Bytes pixels;
    for (std::uint32_t i = 0; i < width * height; ++i) {
        for (const int channel : colour) {
            pixels.push_back(static_cast<std::uint8_t>(channel));
        }
    }
    const auto bytes = pngWithImage({.width = width, .height = height, .pixels = Data(pixels)});
    return {bytes->begin(), bytes->end()};
}

Pixel pixelAt(const std::optional<Data>& bitmap, unsigned x, unsigned y) {
    const auto image = bitmap ? imageWithCachedBitmap(*bitmap)
                              : Expected<Image>(Unexpected(errorWithPOSIXCode(ENOENT)));
    if (!image) {
        ADD_FAILURE() << "no icon";
        return {-1, -1, -1, -1};
    }
    const auto at = image->pixels.bytes().subspan((std::size_t{y} * image->width + x) * 4, 4);
    return {at[0], at[1], at[2], at[3]};
}

class ApplicationIconsTest : public ::testing::Test {
  protected:
    ApplicationIconsTest() {
        makeFolder(directory_.path("icons/hicolor"));
        writeFile(directory_.path("icons/hicolor/index.theme"),
                  "[Icon Theme]\nName=Hicolor\nDirectories=48x48/apps,128x128/apps,scalable/apps\n"
                  "[48x48/apps]\nSize=48\nType=Threshold\n"
                  "[128x128/apps]\nSize=128\nType=Fixed\n"
                  "[scalable/apps]\nSize=64\nMinSize=8\nMaxSize=512\nType=Scalable\n");
        for (const char* folder : {"48x48", "128x128", "scalable"}) {
            makeFolder(directory_.path("icons/hicolor/" + std::string(folder) + "/apps"));
        }
    }
    void put(std::string_view name, std::string_view contents) {
        writeFile(directory_.path("icons/hicolor/" + std::string(name)), contents);
    }
    IconTheme::Places places() const {
        return {{directory_.path("icons")}, directory_.path("pixmaps"), "hicolor"};
    }
    std::unique_ptr<ApplicationIcons> icons() const {
        return std::make_unique<ApplicationIcons>(places(), IconRenderer(program()),
                                                  IconCache(directory_.path("cache/icons")));
    }

    TemporaryDirectory directory_;
};

TEST_F(ApplicationIconsTest, eachVariantHasItsSize) {
    put("scalable/apps/a.svg", svg("red"));
    const auto made = icons();
    for (const auto& [variant, pixels] : {std::pair(0, 60U), std::pair(1, 76U), std::pair(15, 120U),
                                          std::pair(24, 152U), std::pair(32, 180U)}) {
        const auto data = made->iconData("a", variant);
        ASSERT_TRUE(data);
        const auto image = imageWithCachedBitmap(*data);
        ASSERT_TRUE(image);
        EXPECT_EQ(image->width, pixels);
        EXPECT_EQ(image->height, pixels);
        EXPECT_EQ(pixelAt(data, pixels / 2, pixels / 2), red);
    }
    EXPECT_EQ(made->iconData("a", 2), std::nullopt);
    EXPECT_EQ(made->iconData("a", -1), std::nullopt);
}

TEST_F(ApplicationIconsTest, picturesOfPixelsAreEnlargedAtScaleOneAlone) {
    put("48x48/apps/a.png", png(48, 48, red));
    const auto made = icons();
    EXPECT_EQ(pixelAt(made->iconData("a", 0), 30, 30), red);
    EXPECT_EQ(made->iconData("a", 15), std::nullopt);
    put("128x128/apps/a.png", png(128, 128, green));
    made->forget();
    EXPECT_EQ(pixelAt(made->iconData("a", 15), 60, 60), green);
    EXPECT_EQ(made->iconData("a", 32), std::nullopt);
}

TEST_F(ApplicationIconsTest, proportionsAreKept) {
    put("48x48/apps/a.png", png(60, 30, red));
    const auto data = icons()->iconData("a", 0);
    EXPECT_EQ(pixelAt(data, 30, 30), red);
    EXPECT_EQ(pixelAt(data, 30, 5), clear);
    EXPECT_EQ(pixelAt(data, 30, 55), clear);
}

TEST_F(ApplicationIconsTest, anIconMayBeAFileOrHaveAnExtension) {
    writeFile(directory_.path("own.svg"), svg("lime"));
    put("scalable/apps/a.svg", svg("red"));
    const auto made = icons();
    EXPECT_EQ(pixelAt(made->iconData(directory_.path("own.svg"), 32), 90, 90), green);
    EXPECT_EQ(pixelAt(made->iconData("a.svg", 32), 90, 90), red);
    makeFolder(directory_.path("pixmaps"));
    writeFile(directory_.path("pixmaps/plain.png"), png(200, 200, green));
    EXPECT_EQ(pixelAt(made->iconData("plain", 32), 90, 90), green);
    EXPECT_EQ(pixelAt(made->iconData("plain.png", 32), 90, 90), green);
}

TEST_F(ApplicationIconsTest, anApplicationWithoutAnIconHasTheGenericOneAtScaleOne) {
    const auto made = icons();
    const auto builtIn = *cachedBitmapWithImage(builtInIcon(60));
    EXPECT_EQ(made->iconData(std::nullopt, 0), builtIn);
    EXPECT_EQ(made->iconData("none", 0), builtIn);
    EXPECT_EQ(made->iconData(std::nullopt, 32), std::nullopt);
    EXPECT_EQ(made->iconData("../../etc", 15), std::nullopt);
    put("scalable/apps/application-x-executable.svg", svg("lime"));
    made->forget();
    EXPECT_EQ(pixelAt(made->iconData("none", 1), 38, 38), green);
    EXPECT_EQ(made->iconData("none", 15), std::nullopt);
}

TEST_F(ApplicationIconsTest, anIconIsDrawnOnceAndAgainWhenItChanges) {
    put("scalable/apps/a.svg", svg("red"));
    const auto first = icons();
    (void)first->iconData("a", 32);
    (void)first->iconData("a", 32);
    EXPECT_EQ(first->drawn(), 1U);
    const auto second = icons();
    EXPECT_EQ(pixelAt(second->iconData("a", 32), 90, 90), red);
    EXPECT_EQ(second->drawn(), 0U);
    put("scalable/apps/a.svg", svg("lime") + "\n");
    EXPECT_EQ(pixelAt(second->iconData("a", 32), 90, 90), green);
    EXPECT_EQ(second->drawn(), 1U);
}

TEST_F(ApplicationIconsTest, aDamagedCacheIsDrawnAnew) {
    put("scalable/apps/a.svg", svg("red"));
    (void)icons()->iconData("a", 32);
    for (const auto& file : fs::directory_iterator(directory_.path("cache/icons"))) {
        std::string bytes = readFile(file.path());
        bytes[bytes.size() / 2] = static_cast<char>(bytes[bytes.size() / 2] ^ 1);
        writeFile(file.path(), bytes);
    }
    const auto made = icons();
    EXPECT_EQ(pixelAt(made->iconData("a", 32), 90, 90), red);
    EXPECT_EQ(made->drawn(), 1U);
}

TEST_F(ApplicationIconsTest, whatIsNoBitmapInTheCacheIsDrawnAnewWithoutWaiting) {
    put("scalable/apps/a.svg", svg("red"));
    (void)icons()->iconData("a", 32);
    const std::string kept =
        fs::directory_iterator(directory_.path("cache/icons"))->path().string();
    const std::string whole = readFile(kept);
    const std::vector<std::function<void()>> kinds{
        [&] { writeFile(kept, ""); },
        [&] { writeFile(kept, whole.substr(0, whole.size() - 1)); },
        [&] { writeFile(kept, whole + "x"); },
        [&] { ASSERT_EQ(::mkfifo(kept.c_str(), 0600), 0); },
        [&] { fs::create_symlink("/dev/zero", kept); },
        [&] { fs::create_directories(kept + "/in the way"); }};
    for (std::size_t kind = 0; kind < kinds.size(); ++kind) {
        fs::remove_all(kept);
        kinds[kind]();
        const auto made = icons();
        EXPECT_EQ(pixelAt(made->iconData("a", 32), 90, 90), red) << kind;
        EXPECT_EQ(made->drawn(), 1U) << kind;
        const bool isReplaced = fs::is_regular_file(fs::symlink_status(kept));
        EXPECT_EQ(icons()->iconData("a", 32).has_value(), true) << kind;
        EXPECT_EQ(isReplaced, kind + 1 < kinds.size()) << kind;
    }
    // Nothing was left beside it.
    EXPECT_EQ(std::distance(fs::directory_iterator(directory_.path("cache/icons")),
                            fs::directory_iterator()),
              1);
}

TEST_F(ApplicationIconsTest, aFullDiskKeepsNoIconAndNoPartOfOne) {
    put("scalable/apps/a.svg", svg("red"));
    const std::string cache = directory_.path("cache");
    makeFolder(cache);
    const auto disk = ScopedMount::memory(cache, "size=64k");
    if (!disk) {
        MARROWDALE_SKIP_FOR_USER("only root may mount");
    }
    const auto made = icons();
    EXPECT_EQ(pixelAt(made->iconData("a", 32), 90, 90), red);  // 130 KB
    EXPECT_TRUE(fs::is_empty(cache + "/icons"));
    EXPECT_EQ(pixelAt(made->iconData("a", 0), 30, 30), red);  // 15 KB
    EXPECT_FALSE(fs::is_empty(cache + "/icons"));
}

TEST_F(ApplicationIconsTest, aKillAtAnyMomentLeavesAWholeIconOrNone) {
    const Data bitmap = *cachedBitmapWithImage(
        {.width = 180, .height = 180, .pixels = Data(Bytes(std::size_t{4} * 180 * 180, 7))});
    const IconCache cache(directory_.path("cache/icons"));
    for (int round = 0; round < 40; ++round) {
        std::array<int, 2> ends{};
        ASSERT_EQ(::pipe(ends.data()), 0);
        const pid_t child = ::fork();
        if (child == 0) {
            for (;;) {
                cache.keep("key", bitmap);
                (void)!::write(ends[1], "k", 1);
            }
        }
        ASSERT_GT(child, 0);
        ::close(ends[1]);
        // Some way into the saving that follows the first.
        char kept = 0;
        ASSERT_EQ(::read(ends[0], &kept, 1), 1);
        const auto until = std::chrono::steady_clock::now() + std::chrono::microseconds(round * 9);
        while (std::chrono::steady_clock::now() < until) {
        }
        ::kill(child, SIGKILL);
        ::waitpid(child, nullptr, 0);
        ::close(ends[0]);
        const auto found = cache.find("key");
        ASSERT_TRUE(found) << round;  // one was whole before
        ASSERT_EQ(*found, bitmap) << round;
    }
}

TEST_F(ApplicationIconsTest, aCacheThatCantBeWrittenCostsNothingElse) {
    put("scalable/apps/a.svg", svg("red"));
    writeFile(directory_.path("cache"), "a file in the way");
    EXPECT_EQ(pixelAt(icons()->iconData("a", 32), 90, 90), red);
}

TEST_F(ApplicationIconsTest, whatIsNoPictureIsNone) {
    put("scalable/apps/junk.svg", std::string(100'000, 'x'));
    put("48x48/apps/cut.png", png(48, 48, red).substr(0, 60));
    put("scalable/apps/empty.svg", "");
    ASSERT_EQ(::mkfifo(directory_.path("icons/hicolor/scalable/apps/pipe.svg").c_str(), 0600), 0);
    const auto made = icons();
    const auto builtIn = *cachedBitmapWithImage(builtInIcon(60));
    for (const char* name : {"junk", "cut", "empty", "pipe"}) {
        EXPECT_EQ(made->iconData(name, 0), builtIn) << name;
    }
}

TEST_F(ApplicationIconsTest, hostilePicturesEndAtTheirLimits) {
    // Things that use things, ten times each, ten deep.
    std::string bomb =
        "<svg xmlns=\"http://www.w3.org/2000/svg\" "
        "xmlns:xlink=\"http://www.w3.org/1999/xlink\" width=\"8\" height=\"8\">"
        "<g id=\"g0\"><rect width=\"8\" height=\"8\" filter=\"url(#f)\"/></g>";
    for (int depth = 1; depth <= 10; ++depth) {
        bomb += "<g id=\"g" + std::to_string(depth) + "\">";
        for (int i = 0; i < 10; ++i) {
            bomb += "<use xlink:href=\"#g" + std::to_string(depth - 1) + "\"/>";
        }
        bomb += "</g>";
    }
    put("scalable/apps/bomb.svg", bomb + "</svg>");
    put("scalable/apps/outside.svg",
        "<svg xmlns=\"http://www.w3.org/2000/svg\" xmlns:xlink=\"http://www.w3.org/1999/xlink\" "
        "width=\"8\" height=\"8\"><image width=\"8\" height=\"8\" "
        "xlink:href=\"file:///etc/passwd\"/>"
        "</svg>");
    put("48x48/apps/wide.png", png(5000, 1, red));
    const auto made = icons();
    EXPECT_TRUE(made->iconData("bomb", 0));
    EXPECT_EQ(pixelAt(made->iconData("outside", 0), 30, 30), clear);
    EXPECT_EQ(made->iconData("wide", 15), std::nullopt);
}

TEST_F(ApplicationIconsTest, aProgramThatIsMissingLeavesTheBuiltInIcon) {
    put("scalable/apps/a.svg", svg("red"));
    ApplicationIcons made(places(), IconRenderer("/nonexistent/program"), IconCache({}));
    EXPECT_EQ(made.iconData("a", 0), *cachedBitmapWithImage(builtInIcon(60)));
    EXPECT_EQ(made.iconData("a", 32), std::nullopt);
}

class IconRendererTest : public ApplicationIconsTest {
  protected:
    Error failure(const std::string& name, const IconRenderer& renderer) {
        const auto data = renderer.render(directory_.path(name), 60, IconRenderer::Enlarging::no);
        return data ? Error{} : data.error();
    }
    // A program that does what the script says.
    std::string script(std::string_view lines) {
        const std::string path = directory_.path("program");
        writeFile(path, "#!/bin/sh\n" + std::string(lines) + "\n");
        fs::permissions(path, fs::perms::owner_all);
        return path;
    }
};

TEST_F(IconRendererTest, itsErrorsSayWhatWasWrong) {
    const IconRenderer renderer(program());
    EXPECT_EQ(failure("none", renderer), errorWithPOSIXCode(ENOENT));
    EXPECT_EQ(failure("icons", renderer), errorWithPOSIXCode(EINVAL));
    writeFile(directory_.path("small.png"), png(59, 59, red));
    EXPECT_EQ(failure("small.png", renderer), errorWithPOSIXCode(ERANGE));
    writeFile(directory_.path("junk"), "junk");
    EXPECT_EQ(failure("junk", renderer), errorWithPOSIXCode(EINVAL));
    writeFile(directory_.path("huge"), "");
    fs::resize_file(directory_.path("huge"), IconRenderer::largestFile + 1);
    EXPECT_EQ(failure("huge", renderer), errorWithPOSIXCode(EFBIG));
}

TEST_F(IconRendererTest, aProgramThatMisbehavesIsNoDanger) {
    writeFile(directory_.path("a.svg"), svg("red"));
    const auto with = [&](std::string_view lines) {
        return failure("a.svg", IconRenderer(script(lines), std::chrono::milliseconds(300)));
    };
    EXPECT_EQ(with("exec sleep 600"), errorWithPOSIXCode(ETIMEDOUT));
    EXPECT_EQ(with("exec cat /dev/zero"), errorWithPOSIXCode(EFBIG));
    EXPECT_EQ(with("echo nonsense"), errorWithPOSIXCode(EINVAL));
    EXPECT_EQ(with("kill -9 $$"), errorWithPOSIXCode(EINVAL));
    EXPECT_EQ(with("exit 0"), errorWithPOSIXCode(EINVAL));
}

TEST(BuiltInIconTest, itIsATileWithClearCorners) {
    for (const unsigned pixels : {60U, 76U, 1U}) {
        const Image image = builtInIcon(pixels);
        EXPECT_EQ(image.pixels.size(), std::size_t{4} * pixels * pixels);
    }
    const auto bitmap = *cachedBitmapWithImage(builtInIcon(76));
    EXPECT_EQ(pixelAt(bitmap, 0, 0)[3], 0);
    EXPECT_EQ(pixelAt(bitmap, 38, 38)[3], 255);
}

}  // namespace
}  // namespace marrowdale::native
