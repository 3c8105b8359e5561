#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/browser/ContentTypes.h"

namespace marrowdale::host {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

TEST(ContentTypesTest, activeContentIsNeverShown) {
    for (const char* type : {"text/html", "image/svg+xml", "image/svg+xml-compressed",
                             "application/xhtml+xml", "text/xml", "application/javascript",
                             "application/x-shellscript", "text/plain", "inode/directory", ""}) {
        EXPECT_EQ(shownContentType(type), std::nullopt) << type;
    }
    for (const char* type :
         {"image/png", "image/jpeg", "application/pdf", "audio/flac", "video/webm"}) {
        EXPECT_EQ(shownContentType(type), type);
    }
}

TEST(ContentTypesTest, namesAreOneFieldWhateverTheyHold) {
    EXPECT_EQ(attachmentNamed("a b.txt"),
              "attachment; filename=\"a b.txt\"; filename*=UTF-8''a%20b.txt");
    EXPECT_THAT(attachmentNamed("\xC3\xA4"), HasSubstr("filename*=UTF-8''%C3%A4"));
    EXPECT_THAT(attachmentNamed("a\xFF"), HasSubstr("''a%EF%BF%BD"));
    EXPECT_EQ(shownNamed("a.pdf"), "inline; filename=\"a.pdf\"; filename*=UTF-8''a.pdf");
    const std::string hostile = attachmentNamed("a\r\nX: \"y\"\\\xE2\x80\xAEgnp.exe");
    EXPECT_THAT(hostile, Not(HasSubstr("\r")));
    EXPECT_THAT(hostile, Not(HasSubstr("\n")));
    EXPECT_THAT(hostile, HasSubstr("filename=\"aX: _y__gnp.exe\""));
    EXPECT_THAT(hostile, Not(HasSubstr("%E2%80%AE")));
}

}  // namespace
}  // namespace marrowdale::host
