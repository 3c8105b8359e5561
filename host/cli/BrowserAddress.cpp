#include "host/cli/BrowserAddress.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include "host/requests/HarmlessText.h"
#include "host/requests/JsonWriter.h"
#include "platform/foundation/PercentEncoding.h"
#include "platform/linux/files/UniqueFD.h"

namespace marrowdale::host {

namespace {

// Of hexadecimal digits and the like: nothing in an address needs to be escaped.
std::string pageThatLeadsTo(const std::string& address) {
    return "<!doctype html>\n<meta charset=\"utf-8\"><meta name=\"referrer\" "
           "content=\"no-referrer\">"
           "<meta http-equiv=\"refresh\" content=\"0; url=" +
           address + "\">\n<title>Marrowdale</title><a href=\"" + address + "\">Marrowdale</a>\n";
}

// For nobody else to read. What stands there is replaced, be it a link.
bool writePrivately(const std::string& path, std::string_view text) {
    const std::string aside = path + "." + std::to_string(::getpid());
    ::unlink(aside.c_str());
    const native::UniqueFD file(::open(
        aside.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR));
    const bool isWritten =
        file && ::write(file.get(), text.data(), text.size()) == static_cast<ssize_t>(text.size());
    if (isWritten && ::rename(aside.c_str(), path.c_str()) == 0) {
        return true;
    }
    ::unlink(aside.c_str());
    return false;
}

// Signals as a program finds them that nobody has prepared, and a session of its own: Ctrl+C ends
// this program, not the person's web browser.
class FreshAttributes {
  public:
    FreshAttributes() {
        sigset_t none;
        sigset_t all;
        sigemptyset(&none);
        sigfillset(&all);
        ::posix_spawnattr_init(&attributes_);
        ::posix_spawnattr_setsigmask(&attributes_, &none);
        ::posix_spawnattr_setsigdefault(&attributes_, &all);
        ::posix_spawnattr_setflags(
            &attributes_, static_cast<short>(POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF |
                                             POSIX_SPAWN_SETSID));
    }
    ~FreshAttributes() { ::posix_spawnattr_destroy(&attributes_); }
    FreshAttributes(const FreshAttributes&) = delete;
    FreshAttributes& operator=(const FreshAttributes&) = delete;

    [[nodiscard]] const posix_spawnattr_t* get() const { return &attributes_; }

  private:
    posix_spawnattr_t attributes_{};
};

// The desktop's opener may stay for as long as the web browser does, so nobody waits for it: the
// shell that starts it ends at once.
bool openOnDesktop(const std::string& target) {
    std::string script =
        "command -v xdg-open >/dev/null || exit 1\n"
        "xdg-open \"$1\" </dev/null >/dev/null 2>&1 &";
    std::string shell = "sh";
    std::string option = "-c";
    std::string argument = target;
    const std::array<char*, 6> arguments{shell.data(), option.data(),   script.data(),
                                         shell.data(), argument.data(), nullptr};
    const FreshAttributes attributes;
    pid_t process = 0;
    if (::posix_spawn(&process, "/bin/sh", nullptr, attributes.get(), arguments.data(), environ) !=
        0) {
        return false;
    }
    int status = 0;
    while (::waitpid(process, &status, 0) < 0 && errno == EINTR) {
    }
    return status == 0;
}

}  // namespace

void tellBrowserAddress(const CommandContext& context, std::string_view rootPath,
                        const std::optional<std::string>& address) {
    if (context.json()) {
        JsonWriter writer;
        writer.beginObject().key("serving").string(rootPath);
        if (address) {
            writer.key("browser").string(*address);
        }
        writer.endObject();
        context.output().writeLine(writer.take());
    } else {
        context.output().writeLine("serving " + harmlessName(rootPath));
        if (address) {
            context.output().writeLine("open " + *address);
        }
    }
    context.output().flush();
}

bool showInWebBrowser(const Environment& environment, const std::string& stateFolder,
                      const std::string& address) {
    if (!environment.variable("DISPLAY") && !environment.variable("WAYLAND_DISPLAY")) {
        return false;
    }
    const std::string page = stateFolder + "/browse.html";
    return writePrivately(page, pageThatLeadsTo(address)) &&
           openOnDesktop("file://" + percentEncodedPath(page));
}

}  // namespace marrowdale::host
