#include <set>

#include <gtest/gtest.h>

#include "platform/foundation/ResourceValue.h"

namespace marrowdale {
namespace {

TEST(ResourceKeyTest, everyKeyHasANameOfItsOwn) {
    std::set<std::string_view> names;
    for (std::size_t i = 0; i < resourceKeyCount; ++i) {
        names.insert(name(static_cast<ResourceKey>(i)));
    }
    EXPECT_EQ(names.size(), resourceKeyCount);
    EXPECT_EQ(name(ResourceKey::parentDirectoryURL), "OrbURLParentDirectoryURLKey");
    EXPECT_EQ(name(ResourceKey::fileSize), "OrbURLFileSizeKey");
    EXPECT_EQ(name(ResourceKey::fileID), "_kOrbURLFileIDKey");
    EXPECT_EQ(name(ResourceKey::documentIdentifier), "OrbURLDocumentIdentifierKey");
    EXPECT_EQ(name(ResourceKey::isDirectory), "OrbURLIsDirectoryKey");
}

TEST(ResourceKeySetTest, holdsWhatWasInsertedAndNotErased) {
    ResourceKeySet keys{ResourceKey::name, ResourceKey::isDirectory};
    keys.erase(ResourceKey::name);
    keys.insert(ResourceKey::fileSize);
    EXPECT_FALSE(keys.contains(ResourceKey::name));
    EXPECT_TRUE(keys.contains(ResourceKey::fileSize));
    EXPECT_TRUE(keys.contains(ResourceKey::isDirectory));
    EXPECT_TRUE(ResourceKeySet().empty());
}

TEST(ResourceValueTest, namesItsClass) {
    EXPECT_EQ(className(ResourceValue()), "nil");
    EXPECT_EQ(className(std::string("a")), "OrbString");
    EXPECT_EQ(className(Number(1.5)), "OrbNumber");
    EXPECT_EQ(className(Date{}), "OrbDate");
    EXPECT_EQ(className(true), "OrbBoolean");
    EXPECT_EQ(className(Data()), "OrbData");
}

}  // namespace
}  // namespace marrowdale
