#include <atomic>
#include <thread>

#include <gtest/gtest.h>

#include "platform/hostframework/FileProviderConstants.h"
#include "platform/testing/FakePlatform.h"
#include "providers/marrowdale/thumbnails/ApplicationThumbnails.h"
#include "providers/marrowdale/thumbnails/IconVariants.h"

namespace marrowdale {
namespace {

using Lines = std::vector<std::string>;
using Variants = std::vector<int>;

class ApplicationThumbnailsTest : public ::testing::Test {
  protected:
    // An application with icons of these variants, whose bytes are "icon NUMBER".
    void add(const std::string& name, const Variants& variants) {
        const auto record = fake_.applications.add("org.example." + name, name, "/apps/" + name);
        for (const int variant : variants) {
            record->icons.emplace(variant, Data::fromText("icon " + std::to_string(variant)));
        }
        record->onIconAsked = [this](int variant) { asked_.push_back(variant); };
    }
    // Each call, as text.
    Lines fetch(const std::vector<std::string>& identifiers) {
        Lines calls;
        const auto progress =
            ApplicationThumbnails(fake_.platform)
                .fetch(identifiers,
                       FileProviderApplications::ThumbnailHandler(
                           [&](std::string_view identifier, const auto& data, const auto& error) {
                               EXPECT_EQ(error, std::nullopt);
                               calls.push_back(std::string(identifier) + " " +
                                               (data ? data->text() : "none"));
                           }),
                       [&](const auto& error) {
                           EXPECT_EQ(error, std::nullopt);
                           calls.emplace_back("done");
                       });
        EXPECT_TRUE(progress);
        EXPECT_EQ(progress->totalUnitCount, std::nullopt);
        EXPECT_EQ(progress->completedUnitCount, 0U);
        return calls;
    }
    Lines fetchTyped(const std::vector<std::string>& identifiers) {
        Lines calls;
        (void)ApplicationThumbnails(fake_.platform)
            .fetch(identifiers,
                   FileProviderApplications::TypedThumbnailHandler(
                       [&](std::string_view identifier, const auto& data, const auto& format,
                           const auto& error) {
                           EXPECT_EQ(error, std::nullopt);
                           calls.push_back(std::string(identifier) + " " +
                                           (data ? data->text() : "none") + " " +
                                           format.value_or("none"));
                       }),
                   [&](const auto& error) {
                       EXPECT_EQ(error, std::nullopt);
                       calls.emplace_back("done");
                   });
        return calls;
    }
    void setScreen(double scale, std::int64_t deviceClass) {
        fake_.device.scale = Number(scale);
        fake_.device.deviceClass = Number(deviceClass);
    }
    std::size_t count(const std::string& line) const { return fake_.sink->count(line); }

    FakePlatform fake_;
    Variants asked_;
};

TEST_F(ApplicationThumbnailsTest, aFolderHasNoneAndALibraryTheIconInTheOrderGiven) {
    add("A", {15});
    EXPECT_EQ(fetch({"fid=12", "#org.example.A", "did=3"}),
              (Lines{"fid=12 none", "#org.example.A PNGicon 15", "did=3 none", "done"}));
    EXPECT_EQ(
        fake_.sink->countContaining(" fetching thumbnails for [fid=12, #org.example.A, did=3]"),
        1U);
    EXPECT_EQ(count("[DEBUG] #org.example.A: returning 10 bytes"), 1U);
    EXPECT_TRUE(fake_.sink->lines().front().starts_with("[DEBUG] ┏"));
    EXPECT_TRUE(fake_.sink->lines().back().starts_with("[DEBUG] ┗"));
}

TEST_F(ApplicationThumbnailsTest, theTypedRequestAnswersTheBitmapAndItsFormat) {
    add("A", {15});
    EXPECT_EQ(fetchTyped({"fid=12", "#org.example.A"}),
              (Lines{"fid=12 none none",
                     "#org.example.A icon 15 " + std::string(VantrelThumbnailFormatCachedBitmap),
                     "done"}));
    EXPECT_EQ(count("[DEBUG] #org.example.A: returning 7 bytes"), 1U);
}

TEST_F(ApplicationThumbnailsTest, anEmptyListOnlyEnds) {
    EXPECT_EQ(fetch({}), Lines{"done"});
    EXPECT_EQ(fetchTyped({}), Lines{"done"});
}

TEST_F(ApplicationThumbnailsTest, anUnknownApplicationHasNone) {
    EXPECT_EQ(fetch({"#", "#org.example.None"}),
              (Lines{"# none", "#org.example.None none", "done"}));
    EXPECT_EQ(count("[DEBUG] #: can't get app proxy for "), 1U);
    EXPECT_EQ(count("[DEBUG] #org.example.None: can't get app proxy for org.example.None"), 1U);
    EXPECT_EQ(fake_.sink->countOfLevel(LogLevel::error), 0U);
}

TEST_F(ApplicationThumbnailsTest, theFirstVariantFitsTheScreen) {
    EXPECT_EQ(iconVariant(3.0, true), 32);
    EXPECT_EQ(iconVariant(3.0, false), 32);
    EXPECT_EQ(iconVariant(2.0, true), 24);
    EXPECT_EQ(iconVariant(2.0, false), 15);
    for (const double scale : {1.0, 1.5, 2.5, 4.0}) {
        EXPECT_EQ(iconVariant(scale, true), 1);
        EXPECT_EQ(iconVariant(scale, false), 0);
    }
}

TEST_F(ApplicationThumbnailsTest, theSearchGoesDownByWholeSteps) {
    setScreen(3.0, 1);
    add("A", {0});
    EXPECT_EQ(fetch({"#org.example.A"}).front(), "#org.example.A PNGicon 0");
    EXPECT_EQ(asked_, (Variants{32, 15, 0}));
}

TEST_F(ApplicationThumbnailsTest, theSearchOnALargeDeviceTakesItsVariants) {
    setScreen(3.0, 3);
    add("A", {1});
    (void)fetch({"#org.example.A"});
    EXPECT_EQ(asked_, (Variants{32, 24, 1}));
}

TEST_F(ApplicationThumbnailsTest, betweenWholeScalesTheSmallVariantIsAskedAtEachStep) {
    setScreen(2.5, 1);
    add("A", {});
    EXPECT_EQ(fetch({"#org.example.A"}).front(), "#org.example.A none");
    EXPECT_EQ(asked_, (Variants{0, 0}));  // at 2.5 and 1.5; 0.5 is below every scale
    EXPECT_EQ(fake_.sink->countContaining("[DEBUG] #org.example.A: can't get primary icon data; "),
              1U);
}

TEST_F(ApplicationThumbnailsTest, atScaleOneTheSameIsAskedUntilThereIsOne) {
    setScreen(1.0, 1);
    add("A", {});
    const auto record =
        std::dynamic_pointer_cast<FakeBundleRecord>(std::const_pointer_cast<BundleRecord>(
            fake_.applications.bundleRecordForIdentifier("org.example.A")));
    record->onIconAsked = [this, record = record.get()](int variant) {
        asked_.push_back(variant);
        if (asked_.size() == 5) {
            record->icons.emplace(0, Data::fromText("late"));
        }
    };
    EXPECT_EQ(fetch({"#org.example.A"}).front(), "#org.example.A PNGlate");
    EXPECT_EQ(asked_, (Variants{0, 0, 0, 0, 0}));
    record->onIconAsked = nullptr;
}

TEST_F(ApplicationThumbnailsTest, aScaleBelowOneIsNoSearchAtAll) {
    setScreen(0.5, 1);
    add("A", {0, 1, 15, 24, 32});
    EXPECT_EQ(fetch({"#org.example.A"}).front(), "#org.example.A none");
    EXPECT_TRUE(asked_.empty());
}

TEST_F(ApplicationThumbnailsTest, aDeviceThatSaysNothingHasNoScale) {
    fake_.device.scale = std::nullopt;
    fake_.device.deviceClass = std::nullopt;
    add("A", {0, 1});
    EXPECT_EQ(fetch({"#org.example.A"}).front(), "#org.example.A none");
}

TEST_F(ApplicationThumbnailsTest, theScaleIsReadInSinglePrecision) {
    setScreen(2.00000001, 1);
    add("A", {15});
    EXPECT_EQ(fetch({"#org.example.A"}).front(), "#org.example.A PNGicon 15");
}

TEST_F(ApplicationThumbnailsTest, theDeviceIsAskedOnceAlsoByManyThreads) {
    add("A", {15});
    const auto record = fake_.applications.bundleRecordForIdentifier("org.example.A");
    std::dynamic_pointer_cast<FakeBundleRecord>(std::const_pointer_cast<BundleRecord>(record))
        ->onIconAsked = nullptr;
    std::vector<std::thread> threads;
    for (int i = 0; i < 8; ++i) {
        threads.emplace_back([&] { EXPECT_TRUE(bestIconData(fake_.platform, *record)); });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(fake_.device.scaleReads, 1);
    EXPECT_EQ(fake_.device.deviceClassReads, 1);
}

TEST_F(ApplicationThumbnailsTest, anIconThatCantBeReadHasNoThumbnail) {
    add("A", {});
    fake_.device.scale = Number(2.0);
    const auto record =
        std::dynamic_pointer_cast<FakeBundleRecord>(std::const_pointer_cast<BundleRecord>(
            fake_.applications.bundleRecordForIdentifier("org.example.A")));
    record->icons.emplace(15, Data());
    EXPECT_EQ(fetch({"#org.example.A"}), (Lines{"#org.example.A none", "done"}));
    EXPECT_EQ(count("[DEBUG] #org.example.A: can't create icon from cached bitmap"), 1U);
}

TEST_F(ApplicationThumbnailsTest, eachFailureOfTheEncoderHasItsLine) {
    using Fault = FakeImageEncoder::Fault;
    add("A", {15});
    for (const auto& [fault, words] :
         {std::pair(Fault::noData, "can't create new data"),
          std::pair(Fault::noDestination, "can't create image from new data"),
          std::pair(Fault::notFinalized, "can't finalize image")}) {
        fake_.imageEncoder.fault = fault;
        EXPECT_EQ(fetch({"#org.example.A"}), (Lines{"#org.example.A none", "done"}));
        EXPECT_EQ(count("[ERROR] #org.example.A: " + std::string(words)), 1U);
    }
}

}  // namespace
}  // namespace marrowdale
