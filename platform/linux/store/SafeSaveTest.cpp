// Documents keep their identifiers through the ways in which programs save, and other things that
// look alike give new documents.

#include <fcntl.h>
#include <functional>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "platform/linux/store/StoreEventsTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

using testing::Contains;
using testing::HasSubstr;
using testing::Not;

class SafeSaveTest : public StoreEventsTest {
  protected:
    bool hasTags_ = false;

    // A document "doc" that was told of, and what goes with it.
    DocumentID beginWithDocument() {
        write("doc", "first");
        hasTags_ = setTag("doc");
        write("other", "x");
        makeFolder(path("folder"));
        begin();
        const auto document = documentOf("doc");
        (void)news();
        settle();
        return document;
    }
    void exchange(const std::string& a, const std::string& b) {
        ASSERT_EQ(
            ::renameat2(AT_FDCWD, path(a).c_str(), AT_FDCWD, path(b).c_str(), RENAME_EXCHANGE), 0);
    }
    // The identifier stayed with the name, and is in the feed.
    void expectKept(DocumentID document, const std::string& name = "doc") {
        const auto texts = news();
        EXPECT_EQ(placeOf(document), name);
        EXPECT_EQ(documentOf(name), document);
        EXPECT_THAT(texts, Contains("moved document"));
        if (hasTags_) {
            EXPECT_EQ(tagOf(name), tagValue) << "tags stay with the document";
        }
        // A program that saves in two steps may be seen in between; then it is there again.
        EXPECT_THAT(texts, Contains(HasSubstr(" " + name)));
    }
    void expectNew(DocumentID document, const std::string& name = "doc") {
        const auto texts = news();
        EXPECT_THAT(texts, Not(Contains("moved document")));
        EXPECT_NE(documentOf(name), document);
    }
};

TEST_P(SafeSaveTest, ATemporaryFileIsRenamedOverIt) {
    const auto document = beginWithDocument();
    write(".doc.tmp", "second");
    rename(".doc.tmp", "doc");
    expectKept(document);
}

TEST_P(SafeSaveTest, AManyTimes) {
    const auto document = beginWithDocument();
    for (int i = 0; i < 10; ++i) {
        write("temporary" + std::to_string(i), "text " + std::to_string(i));
        rename("temporary" + std::to_string(i), "doc");
        expectKept(document);
    }
}

TEST_P(SafeSaveTest, ATemporaryFileThatWasToldOfIsGoneAfterwards) {
    const auto document = beginWithDocument();
    write("temporary", "second");
    const auto passing = documentOf("temporary");
    (void)news();
    EXPECT_NE(passing, document);
    rename("temporary", "doc");
    const auto texts = news();
    EXPECT_EQ(placeOf(document), "doc");
    EXPECT_THAT(texts, Contains(HasSubstr("(did=" + std::to_string(raw(passing)) + ")")));
    EXPECT_EQ(documentOf("doc"), document);
}

TEST_P(SafeSaveTest, DeletedThenRenamedOnto) {
    const auto document = beginWithDocument();
    write("temporary", "second");
    remove("doc");
    rename("temporary", "doc");
    expectKept(document);
}

TEST_P(SafeSaveTest, BackedUpThenWrittenAnew) {
    const auto document = beginWithDocument();
    rename("doc", "doc~");
    write("doc", "second");
    expectKept(document);
    EXPECT_NE(documentOf("doc~"), document) << "the back-up is a document of its own";
}

TEST_P(SafeSaveTest, BackedUpWrittenAnewAndTheBackupDeleted) {
    const auto document = beginWithDocument();
    rename("doc", "doc~");
    write("doc", "second");
    remove("doc~");
    expectKept(document);
}

TEST_P(SafeSaveTest, RenamedAwayRenamedInAndDeleted) {
    const auto document = beginWithDocument();
    write("new.tmp", "second");
    rename("doc", "old.tmp");
    rename("new.tmp", "doc");
    remove("old.tmp");
    expectKept(document);
}

TEST_P(SafeSaveTest, BackedUpAndRenamedIn) {
    const auto document = beginWithDocument();
    write("sedX", "second");
    rename("doc", "doc.bak");
    rename("sedX", "doc");
    expectKept(document);
}

TEST_P(SafeSaveTest, ABackupIsLinkedAndANewFileRenamedOver) {
    const auto document = beginWithDocument();
    write(".goutputstream-X", "second");
    link("doc", "doc~");
    rename(".goutputstream-X", "doc");
    expectKept(document);
    EXPECT_NE(documentOf("doc~"), document);
}

TEST_P(SafeSaveTest, ExchangedAndTheEarlierFileDeleted) {
    const auto document = beginWithDocument();
    write("temporary", "second");
    exchange("temporary", "doc");
    remove("temporary");
    expectKept(document);
}

TEST_P(SafeSaveTest, ExchangedWithAnother) {
    const auto document = beginWithDocument();
    const auto other = documentOf("other");
    (void)news();
    exchange("doc", "other");
    (void)news();
    if (isLive()) {
        EXPECT_EQ(placeOf(document), "doc");
        EXPECT_EQ(placeOf(other), "other");
    } else {
        // Nobody saw that it was one step: each goes with its file.
        EXPECT_EQ(placeOf(document), "other");
        EXPECT_EQ(placeOf(other), "doc");
    }
}

TEST_P(SafeSaveTest, WrittenInPlaceAfterACopyWasMade) {
    const auto document = beginWithDocument();
    std::filesystem::copy_file(path("doc"), path("doc~"));
    write("doc", "second");
    (void)news();
    EXPECT_EQ(documentOf("doc"), document);
    EXPECT_NE(documentOf("doc~"), document);
}

TEST_P(SafeSaveTest, APackageThatIsReplacedWhole) {
    write("doc.bundle/text", "first");
    begin();
    const auto document = documentOf("doc.bundle");
    (void)news();
    write("doc.bundle.tmp/text", "second");
    rename("doc.bundle", "doc.bundle.old");
    rename("doc.bundle.tmp", "doc.bundle");
    remove("doc.bundle.old");
    (void)news();
    EXPECT_EQ(placeOf(document), "doc.bundle");
}

TEST_P(SafeSaveTest, AFileMadeAnewWhereOneWasDeletedIsAnother) {
    const auto document = beginWithDocument();
    remove("doc");
    write("doc", "second");
    if (isLive()) {
        expectNew(document);
        EXPECT_THAT(placeOf(document), HasSubstr("find the file of"));
    } else {
        // Afterwards it looks like any save, and is taken for one.
        expectKept(document);
    }
}

TEST_P(SafeSaveTest, ARotatedLogIsAnother) {
    const auto document = beginWithDocument();
    rename("doc", "doc.1");
    write("doc", "second");
    expectNew(document);
    EXPECT_EQ(placeOf(document), "doc.1");
}

TEST_P(SafeSaveTest, ANameTakenAgainAfterAMoveIsAnother) {
    const auto document = beginWithDocument();
    rename("doc", "folder/doc");
    write("doc", "second");
    expectNew(document);
    EXPECT_EQ(placeOf(document), "folder/doc");
}

TEST_P(SafeSaveTest, ANameTakenAgainAfterTheTrashIsAnother) {
    const auto document = beginWithDocument();
    makeFolder(path(".Trash"));
    rename("doc", ".Trash/doc");
    write("doc", "second");
    expectNew(document);
    EXPECT_EQ(placeOf(document), ".Trash/doc");
}

TEST_P(SafeSaveTest, AFileOfAnotherFolderMovedOverItIsAnother) {
    const auto document = beginWithDocument();
    write("folder/incoming", "second");
    const auto incoming = documentOf("folder/incoming");
    (void)news();
    rename("folder/incoming", "doc");
    const auto texts = news();
    EXPECT_EQ(placeOf(incoming), "doc");
    EXPECT_THAT(placeOf(document), HasSubstr("find the file of"));
    EXPECT_THAT(texts, Contains(HasSubstr("(did=" + std::to_string(raw(document)) + ")")));
}

TEST_P(SafeSaveTest, ACopyIsAnother) {
    const auto document = beginWithDocument();
    std::filesystem::copy_file(path("doc"), path("copy"));
    expectNew(document, "copy");
    EXPECT_EQ(placeOf(document), "doc");
}

TEST_P(SafeSaveTest, TagsThatTheNewFileHasAreItsOwn) {
    const auto document = beginWithDocument();
    if (!hasTags_) {
        MARROWDALE_SKIP("this file system keeps no user attributes");
    }
    write("temporary", "second");
    ASSERT_EQ(::setxattr(path("temporary").c_str(), tagName, "own", 3, 0), 0);
    rename("temporary", "doc");
    (void)news();
    EXPECT_EQ(documentOf("doc"), document);
    EXPECT_EQ(tagOf("doc"), "own");
}

TEST_P(SafeSaveTest, TagsSetLaterStayTooAndThoseTakenAwayDont) {
    const auto document = beginWithDocument();
    if (!hasTags_) {
        MARROWDALE_SKIP("this file system keeps no user attributes");
    }
    ASSERT_EQ(::removexattr(path("doc").c_str(), tagName), 0);
    ASSERT_EQ(::setxattr(path("doc").c_str(), "user.com.quillory.later", "l", 1, 0), 0);
    ASSERT_EQ(::setxattr(path("doc").c_str(), "user.somebody.else", "s", 1, 0), 0);
    (void)news();
    write("temporary", "second");
    rename("temporary", "doc");
    (void)news();
    EXPECT_EQ(documentOf("doc"), document);
    EXPECT_EQ(tagOf("doc"), "");
    char value = 0;
    EXPECT_EQ(::getxattr(path("doc").c_str(), "user.com.quillory.later", &value, 1), 1);
    EXPECT_EQ(::getxattr(path("doc").c_str(), "user.somebody.else", &value, 1), -1)
        << "what belongs to the file goes with it";
}

TEST_P(SafeSaveTest, TagsComeWhenTheFileCanBeWritten) {
    if (::geteuid() == 0) {
        MARROWDALE_SKIP_FOR_USER("permissions don't bind root");
    }
    const auto document = beginWithDocument();
    if (!hasTags_) {
        MARROWDALE_SKIP("this file system keeps no user attributes");
    }
    write("temporary", "second");
    ASSERT_EQ(::chmod(path("temporary").c_str(), 0400), 0);
    rename("temporary", "doc");
    (void)news();
    EXPECT_EQ(documentOf("doc"), document);
    EXPECT_EQ(tagOf("doc"), "");
    ASSERT_EQ(::chmod(path("doc").c_str(), 0600), 0);
    (void)news();
    EXPECT_EQ(tagOf("doc"), isLive() ? tagValue : "") << "what waits does not outlast a restart";
}

TEST_P(SafeSaveTest, WhatIsMovedOutAndBackIsTheSame) {
    const auto document = beginWithDocument();
    const std::string outside = root() + "-outside";
    std::filesystem::rename(path("doc"), outside);
    if (isLive()) {
        EXPECT_THAT(news(), Contains("gone doc (did=" + std::to_string(raw(document)) + ")"));
    }
    std::filesystem::rename(outside, path("doc"));
    (void)news();
    EXPECT_EQ(placeOf(document), "doc");
    EXPECT_EQ(documentOf("doc"), document);
}

INSTANTIATE_TEST_SUITE_P(OnEach, SafeSaveTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify,
                                                          Following::restart)),
                         nameOf);

}  // namespace
}  // namespace marrowdale::native
