#include <cerrno>
#include <set>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "platform/testing/FakePlatform.h"
#include "providers/marrowdale/items/FileSystemAccess.h"

namespace marrowdale {
namespace {

constexpr std::string_view attributeName = "com.quillory.trash.time#PS";

class FileSystemAccessTest : public ::testing::Test {
  protected:
    // Makes the resource answer that.
    void answer(Expected<ResourceValue> value) {
        fake_.fileSystem.resourceAnswer =
            [value](const URL&, ResourceKey) -> std::optional<Expected<ResourceValue>> {
            return value;
        };
    }
    std::vector<std::string> lines() const { return fake_.sink->lines(); }

    FakePlatform fake_;
    const Platform& platform_ = fake_.platform;
    const URL url_ = URL::fileURL("/storage/a b");
    const FakeOpenFile file_{url_};
};

TEST_F(FileSystemAccessTest, readingAnAttributeThatDoesNotExistYieldsNoValueAndNoLogLine) {
    EXPECT_EQ(initWithValueOfXattr(platform_, attributeName, url_), std::nullopt);
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, readingWhereNoAttributesAreKeptYieldsNoValueAndNoLogLine) {
    fake_.attributes.sizeError = ENOTSUP;
    EXPECT_EQ(initWithValueOfXattr(platform_, attributeName, url_), std::nullopt);
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, readsAWholeValue) {
    ASSERT_EQ(setXattr(platform_, file_, attributeName, Data::fromText("value")), 0);
    EXPECT_EQ(initWithValueOfXattr(platform_, attributeName, url_), Data::fromText("value"));
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, anAttributeWhoseSizeCantBeReadIsLogged) {
    fake_.attributes.sizeError = EIO;
    EXPECT_EQ(initWithValueOfXattr(platform_, attributeName, url_), std::nullopt);
    EXPECT_EQ(lines(),
              std::vector<std::string>{"[ERROR] can't get xattr com.quillory.trash.time#PS; " +
                                       errorWithPOSIXCode(EIO).description()});
}

TEST_F(FileSystemAccessTest, anAttributeThatGoesBetweenSizeAndReadIsLogged) {
    ASSERT_EQ(setXattr(platform_, file_, attributeName, Data::fromText("value")), 0);
    fake_.attributes.readError = ENODATA;
    EXPECT_EQ(initWithValueOfXattr(platform_, attributeName, url_), std::nullopt);
    EXPECT_EQ(lines(), std::vector<std::string>{
                           "[ERROR] can't copy data for xattr com.quillory.trash.time#PS; " +
                           errorWithPOSIXCode(ENODATA).description()});
}

TEST_F(FileSystemAccessTest, anAttributeThatCantBeSetIsLoggedAndItsErrorNumberAnswered) {
    fake_.attributes.setError = ENOSPC;
    EXPECT_EQ(setXattr(platform_, file_, attributeName, Data()), ENOSPC);
    EXPECT_EQ(lines(),
              std::vector<std::string>{"[ERROR] can't set xattr \"com.quillory.trash.time#PS\"; " +
                                       errorWithPOSIXCode(ENOSPC).description()});
}

TEST_F(FileSystemAccessTest, removingAnAttributeThatDoesNotExistSucceeds) {
    EXPECT_EQ(removeXattr(platform_, file_, attributeName), 0);
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, anAttributeThatCantBeRemovedIsLoggedAndItsErrorNumberAnswered) {
    fake_.attributes.removeError = EROFS;
    EXPECT_EQ(removeXattr(platform_, file_, attributeName), EROFS);
    EXPECT_EQ(lines(), std::vector<std::string>{
                           "[ERROR] can't remove xattr \"com.quillory.trash.time#PS\"; " +
                           errorWithPOSIXCode(EROFS).description()});
}

TEST_F(FileSystemAccessTest, aResourceThatCantBeReadIsLogged) {
    const Error error = errorWithPOSIXCode(EIO);
    answer(Unexpected(error));
    EXPECT_EQ(resourceString(platform_, url_, ResourceKey::typeIdentifier), std::nullopt);
    EXPECT_EQ(lines(),
              std::vector<std::string>{"[ERROR] can't get resource \"OrbURLTypeIdentifierKey\" for "
                                       "file:///storage/a%20b; " +
                                       error.description()});
}

TEST_F(FileSystemAccessTest, aResourceWithoutAValueIsNotLogged) {
    answer(ResourceValue());
    EXPECT_EQ(resourceNumber(platform_, url_, ResourceKey::fileSize), std::nullopt);
    EXPECT_EQ(resourceDate(platform_, url_, ResourceKey::creationDate), std::nullopt);
    EXPECT_EQ(resourceBoolean(platform_, url_, ResourceKey::isWritable), std::nullopt);
    EXPECT_EQ(resourceData(platform_, url_, ResourceKey::contentModificationDate), std::nullopt);
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, eachGetterAnswersItsOwnTypeAlone) {
    answer(ResourceValue(std::string("text")));
    EXPECT_EQ(resourceString(platform_, url_, ResourceKey::name), "text");
    EXPECT_EQ(resourceNumber(platform_, url_, ResourceKey::name), std::nullopt);
    answer(ResourceValue(Number(std::int64_t{-3})));
    EXPECT_EQ(resourceNumber(platform_, url_, ResourceKey::fileSize), Number(std::int64_t{-3}));
    answer(ResourceValue(Date{1, 2}));
    EXPECT_EQ(resourceDate(platform_, url_, ResourceKey::creationDate), (Date{1, 2}));
    EXPECT_EQ(resourceBoolean(platform_, url_, ResourceKey::creationDate), std::nullopt);
    answer(ResourceValue(true));
    EXPECT_EQ(resourceBoolean(platform_, url_, ResourceKey::isWritable), true);
    answer(ResourceValue(Data::fromText("bytes")));
    EXPECT_EQ(resourceData(platform_, url_, ResourceKey::name), Data::fromText("bytes"));
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, aDateReadAsDataIsItsStableEncoding) {
    answer(ResourceValue(Date{-1, 500'000'000}));
    EXPECT_EQ(resourceData(platform_, url_, ResourceKey::contentModificationDate),
              Data(Bytes{0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0xff, 0x1d, 0xcd, 0x65, 0x00}));
    EXPECT_EQ(dataWithDate({0x0102030405060708, 9}),
              Data(Bytes{1, 2, 3, 4, 5, 6, 7, 8, 0, 0, 0, 9}));
}

TEST_F(FileSystemAccessTest, whatAListingLearntIsAnsweredWithoutTheSystem) {
    answer(Unexpected(errorWithPOSIXCode(EIO)));
    PrefetchedValues values;
    values.known = {ResourceKey::name,
                    ResourceKey::typeIdentifier,
                    ResourceKey::fileSize,
                    ResourceKey::creationDate,
                    ResourceKey::contentModificationDate,
                    ResourceKey::isWritable,
                    ResourceKey::isDirectory,
                    ResourceKey::isPackage};
    values.fileSize = 5;
    values.creationDate = {1, 2};
    values.contentModificationDate = {3, 4};
    values.typeIdentifier = "text/plain";
    values.isWritable = true;
    values.isDirectory = true;
    const URL child = URL::listedChild(URL::fileURL("/storage"), "name", values);
    EXPECT_EQ(resourceString(platform_, child, ResourceKey::name), "name");
    EXPECT_EQ(resourceString(platform_, child, ResourceKey::typeIdentifier), "text/plain");
    EXPECT_EQ(resourceNumber(platform_, child, ResourceKey::fileSize), Number(std::uint64_t{5}));
    EXPECT_EQ(resourceDate(platform_, child, ResourceKey::creationDate), (Date{1, 2}));
    EXPECT_EQ(resourceDate(platform_, child, ResourceKey::contentModificationDate), (Date{3, 4}));
    EXPECT_EQ(resourceData(platform_, child, ResourceKey::contentModificationDate),
              dataWithDate({3, 4}));
    EXPECT_EQ(resourceBoolean(platform_, child, ResourceKey::isWritable), true);
    EXPECT_TRUE(hx_isFolder(platform_, child));
    values.absent = {ResourceKey::fileSize, ResourceKey::creationDate};
    values.isPackage = true;
    const URL other = URL::listedChild(URL::fileURL("/storage"), "name", values);
    EXPECT_EQ(resourceNumber(platform_, other, ResourceKey::fileSize), std::nullopt);
    EXPECT_EQ(resourceDate(platform_, other, ResourceKey::creationDate), std::nullopt);
    EXPECT_FALSE(hx_isFolder(platform_, other)) << "a package is no folder";
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, whatCantBeLookedAtIsNoFolder) {
    EXPECT_FALSE(hx_isFolder(platform_, url_));
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, anArchivedValueOfTheExpectedClassIsAnswered) {
    const Data data = *archive(ArchivedObject(Date{5, 6}));
    EXPECT_EQ(unarchivedObject<Date>(platform_, data, "source"), (Date{5, 6}));
    EXPECT_TRUE(lines().empty());
}

TEST_F(FileSystemAccessTest, anArchivedValueOfTheWrongClassFailsAndIsLogged) {
    const Data data = *archive(ArchivedObject(Number(std::int64_t{1})));
    const auto object = unarchivedObject<Date>(platform_, data, "its source");
    ASSERT_FALSE(object);
    EXPECT_EQ(object.error(), UnarchiveError::invalidResultingClass);
    EXPECT_EQ(lines(), std::vector<std::string>{
                           "[ERROR] got OrbNumber while unarchiving object from its source"});
}

TEST_F(FileSystemAccessTest, bytesThatAreNoArchiveFailLikeAWrongClass) {
    EXPECT_FALSE(unarchivedObject<Date>(platform_, Data::fromText("garbage"), "its source"));
    EXPECT_EQ(lines(),
              std::vector<std::string>{"[ERROR] got nil while unarchiving object from its source"});
}

TEST_F(FileSystemAccessTest, twoSectionsOpenedAtOnceGetDifferentNumbers) {
    constexpr int sectionsPerThread = 200;
    std::vector<std::uint64_t> numbers[2];
    std::vector<std::thread> threads;
    for (auto& mine : numbers) {
        threads.emplace_back([this, &mine] {
            for (int i = 0; i < sectionsPerThread; ++i) {
                mine.push_back(LogSection(fake_.log, "title").number());
            }
        });
    }
    for (auto& thread : threads) {
        thread.join();
    }
    std::set<std::uint64_t> all(numbers[0].begin(), numbers[0].end());
    all.insert(numbers[1].begin(), numbers[1].end());
    EXPECT_EQ(all.size(), 2U * sectionsPerThread);
    EXPECT_EQ(*all.begin(), 0U);
    EXPECT_EQ(*all.rbegin(), 2U * sectionsPerThread - 1);
}

TEST_F(FileSystemAccessTest, theErrorConstructorsCarryNoUserInfo) {
    const Error posix = errorWithPOSIXCode(EIO);
    EXPECT_EQ(posix.domain, ErrorDomain::posix);
    EXPECT_EQ(posix.code, EIO);
    EXPECT_TRUE(posix.operation.empty() && posix.subject.empty());
    const Error denied = errorFileWriteNoPermission();
    EXPECT_EQ(denied.domain, ErrorDomain::file);
    EXPECT_EQ(denied.code, 513);
    EXPECT_TRUE(denied.operation.empty() && denied.subject.empty());
}

TEST_F(FileSystemAccessTest, unsignedValueTakesWhatUnsignedNumbersCanHold) {
    EXPECT_EQ(unsignedValue(Number(~std::uint64_t{0})), ~std::uint64_t{0});
    EXPECT_EQ(unsignedValue(Number(std::int64_t{7})), 7U);
    EXPECT_EQ(unsignedValue(Number(std::int64_t{-7})), std::nullopt);
    EXPECT_EQ(unsignedValue(Number(7.0)), std::nullopt);
}

}  // namespace
}  // namespace marrowdale
