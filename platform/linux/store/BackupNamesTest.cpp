#include <gtest/gtest.h>

#include "platform/linux/store/BackupNames.h"

namespace marrowdale::native {
namespace {

TEST(BackupNamesTest, NamesThatEditorsMake) {
    for (const auto* name : {"a.txt~", "a.txt.~1~", "a.txt.~12~", "a.txt.bak", "a.txt.orig",
                             "a.txt.old", "#a.txt#", ".a.txt.swp", ".a.txt.sb-1-x"}) {
        EXPECT_TRUE(isBackupName("a.txt", name)) << name;
    }
}

TEST(BackupNamesTest, NamesOfDocumentsOfTheirOwn) {
    for (const auto* name :
         {"a.txt", "a.txt.1", "a.txt.2.gz", "b.txt~", "a.txt~~", "a.txt.~~", "a.txt.~x~", "a.txt.",
          ".a.txt", ".a.txt.", "#a.txt", "a.txt#", "#a.txt##", "a copy.txt", "", "~"}) {
        EXPECT_FALSE(isBackupName("a.txt", name)) << name;
    }
    EXPECT_FALSE(isBackupName("", "~"));
    EXPECT_FALSE(isBackupName("", "##"));
}

}  // namespace
}  // namespace marrowdale::native
