#include "tests/history/RandomWriter.h"

#include <array>
#include <fcntl.h>
#include <filesystem>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>
#include <utility>

namespace marrowdale::tests {

// A step that fails, because what it needs is not there, is part of the game: nothing here looks at
// what calls answer.

RandomWriter::RandomWriter(std::string root, std::uint32_t seed, HardLinks hardLinks)
    : root_(std::move(root)), linked_(root_ + "-linked"), hardLinks_(hardLinks), random_(seed) {
    write(linked_);
}

std::string RandomWriter::folder() {
    static constexpr std::array names{"A", "B", "C", "D", ".hid", "P.bundle"};
    std::string path = root_;
    for (unsigned depth = upTo(4); depth > 0; --depth) {
        // Hidden folders and packages less often.
        const unsigned which = upTo(10);
        path += std::string("/") + names.at(which < 8 ? which / 2 : which - 4);
    }
    return path;
}

std::string RandomWriter::file() {
    static constexpr std::array names{"a", "b.txt", "c", "d.png", "e", "f~", ".hidden", "n\nl"};
    return folder() + "/" + names.at(upTo(names.size()));
}

void RandomWriter::write(const std::string& path) {
    const int file = ::open(path.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0644);
    if (file >= 0) {
        const std::string text(upTo(300), 'x');
        (void)!::write(file, text.data(), text.size());
        ::close(file);
    }
}

void RandomWriter::append(const std::string& path) {
    const int file = ::open(path.c_str(), O_WRONLY | O_APPEND | O_NONBLOCK | O_CLOEXEC);
    if (file >= 0) {
        (void)!::write(file, "more", 4);
        ::close(file);
    }
}

void RandomWriter::rename(const std::string& from, const std::string& to, unsigned flags) const {
    (void)::renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), flags);
}

void RandomWriter::moveFolder() {
    const std::string from = folder();
    if (from == root_) {
        return;
    }
    const std::string beside = from.substr(0, from.rfind('/'));
    switch (upTo(5)) {
        case 0:
            rename(from, from + ".bundle");
            rename(beside + "/P.bundle", beside + "/A");
            break;
        case 1:
            rename(from, beside + "/.hid");
            break;
        case 2:
            rename(beside + "/.hid", from);
            break;
        default:
            rename(from, folder());
    }
}

void RandomWriter::save() {
    const std::string document = file();
    const std::string beside = document.substr(0, document.rfind('/'));
    const std::string temporary = beside + "/.tmp" + std::to_string(upTo(1000));
    switch (upTo(5)) {
        case 0:
            write(temporary);
            rename(temporary, document);
            break;
        case 1:
            rename(document, document + "~");
            write(document);
            break;
        case 2:
            rename(document, document + "~");
            write(document);
            (void)::unlink((document + "~").c_str());
            break;
        case 3:
            write(temporary);
            rename(temporary, document, RENAME_EXCHANGE);
            (void)::unlink(temporary.c_str());
            break;
        default:
            write(temporary);
            (void)::link(document.c_str(), (document + "~").c_str());
            rename(temporary, document);
    }
}

void RandomWriter::step() {
    std::error_code ignored;
    switch (upTo(22)) {
        case 0:
        case 1:
        case 2:
            (void)::mkdir(folder().c_str(), 0755);
            break;
        case 3:
        case 4:
        case 5:
        case 6:
        case 7:
            write(file());
            break;
        case 8:
            append(file());
            break;
        case 9:
        case 10:
            (void)::unlink(file().c_str());
            break;
        case 11:
        case 12:
            rename(file(), file());
            break;
        case 13:
        case 14:
            moveFolder();
            break;
        case 15:
            rename(file(), file(), RENAME_EXCHANGE);
            break;
        case 16:
            rename(folder(), folder(), RENAME_EXCHANGE);
            break;
        case 17:
            if (hardLinks_ == HardLinks::made) {
                (void)::link(file().c_str(), file().c_str());
            }
            break;
        case 18:
            if (const std::string tree = folder(); tree != root_ && upTo(3) == 0) {
                std::filesystem::remove_all(tree, ignored);
            }
            break;
        case 19:
            (void)::chmod(file().c_str(), 0600 + (upTo(2) << 5U));
            (void)::lsetxattr(file().c_str(), "user.tag", "red", 3, 0);
            break;
        case 20:
            // To what is always there, and nobody else's: modes are set through links, and an
            // item's own events don't tell of what a link points to.
            (void)::symlink(linked_.c_str(), file().c_str());
            break;
        default:
            save();
    }
}

}  // namespace marrowdale::tests
