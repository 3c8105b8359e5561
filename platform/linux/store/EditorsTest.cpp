// Real programs save a document, each in its way: it keeps its identifier and its tags.

#include <cstdlib>
#include <fstream>
#include <iterator>

#include "platform/linux/store/StoreEventsTestSupport.h"
#include "platform/testing/TestSkip.h"

namespace marrowdale::native {
namespace {

using testing::Contains;
using testing::EndsWith;

// Quick and quiet, with nobody's settings; back-ups beside the file, /tmp included.
constexpr const char* vim =
    "vim.tiny -u NONE -N -es '+set backupskip=' {} '+s/first/second/' +wq doc </dev/null";
constexpr const char* emacs =
    "emacs --batch -Q doc --eval '(progn {} (while (search-forward \"first\" nil t) "
    "(replace-match \"second\")) (save-buffer))'";

struct Editor {
    std::string name;
    std::string program;
    std::string command;  // run beside "doc", whose text "first" becomes "second"
};

Editor withSetting(const std::string& name, const std::string& program, std::string command,
                   const std::string& setting) {
    return {name, program, command.replace(command.find("{}"), 2, setting)};
}

const std::vector<Editor>& editors() {
    static const std::vector<Editor> all{
        withSetting("vimAuto", "vim.tiny", vim, "'+set backupcopy=auto'"),
        withSetting("vimRenames", "vim.tiny", vim, "'+set backupcopy=no'"),
        withSetting("vimRenamesAndKeeps", "vim.tiny", vim, "'+set backupcopy=no backup'"),
        withSetting("vimCopies", "vim.tiny", vim, "'+set backupcopy=yes'"),
        withSetting("emacs", "emacs", emacs, ""),
        withSetting("emacsByCopying", "emacs", emacs, "(setq backup-by-copying t)"),
        withSetting("emacsPrecious", "emacs", emacs, "(setq file-precious-flag t)"),
        withSetting("emacsWithoutBackup", "emacs", emacs, "(setq make-backup-files nil)"),
        {"sed", "sed", "sed -i s/first/second/ doc"},
        {"sedWithBackup", "sed", "sed -i.bak s/first/second/ doc"},
        {"gio", "gio", "printf 'second\\n' | gio save doc"},
        {"gioWithBackup", "gio", "printf 'second\\n' | gio save -b doc"},
        {"python", "python3",
         "python3 -c 'import os; open(\"t\", \"w\").write(\"second\\n\"); os.replace(\"t\", "
         "\"doc\")'"},
    };
    return all;
}

class EditorsTest : public StoreEventsTest {
  protected:
    [[nodiscard]] bool runIn(const std::string& folder, const std::string& command) const {
        const std::string line =
            "cd '" + path(folder) + "' && { " + command + "; } >/dev/null 2>&1";
        return std::system(line.c_str()) == 0;  // NOLINT(concurrency-mt-unsafe,cert-env33-c)
    }
    [[nodiscard]] std::string textOf(const std::string& below) const {
        std::ifstream file(path(below));
        return {std::istreambuf_iterator<char>(file), {}};
    }
    // A folder for each editor, with a document that was told of.
    void beginWithDocuments() {
        for (const Editor& editor : editors()) {
            const std::string document = editor.name + "/doc";
            write(document, "first\n");
            hasTags_ = setTag(document);
        }
        begin();
        for (const Editor& editor : editors()) {
            documents_[editor.name] = documentOf(editor.name + "/doc");
        }
        (void)news();
        settle();
    }
    void expectKeptBy(const Editor& editor) {
        const std::string place = editor.name + "/doc";
        ASSERT_TRUE(runIn(editor.name, editor.command)) << editor.command;
        ASSERT_EQ(textOf(place), "second\n");
        EXPECT_THAT(news(), Contains(EndsWith(" " + place)));
        EXPECT_EQ(documentOf(place), documents_.at(editor.name));
        EXPECT_EQ(placeOf(documents_.at(editor.name)), place);
        if (hasTags_) {
            EXPECT_EQ(tagOf(place), tagValue);
        }
    }

  private:
    Documents documents_;
    bool hasTags_ = false;
};

TEST_P(EditorsTest, KeepTheDocumentThatTheySave) {
    beginWithDocuments();
    for (const Editor& editor : editors()) {
        SCOPED_TRACE(editor.name);
        if (!runIn("", "command -v " + editor.program)) {
            MARROWDALE_SKIP(editor.program + " is not installed");
        }
        expectKeptBy(editor);
    }
}

INSTANTIATE_TEST_SUITE_P(OnEach, EditorsTest,
                         testing::Combine(testing::ValuesIn(testFileSystems()),
                                          testing::Values(Following::fanotify, Following::inotify,
                                                          Following::restart)),
                         nameOf);

}  // namespace
}  // namespace marrowdale::native
