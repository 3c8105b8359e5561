#include "host/cli/StandardDescriptors.h"

#include <cerrno>
#include <fcntl.h>
#include <initializer_list>
#include <unistd.h>

namespace marrowdale::host {

bool fillStandardDescriptors() {
    for (const int descriptor : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
        if (::fcntl(descriptor, F_GETFD) >= 0 || errno != EBADF) {
            continue;
        }
        // The lowest free number is this one, for those below it are taken. Reading only: what is
        // written must be refused, not lost in silence. A folder refuses reading too, and is there
        // where a sandbox has no devices.
        int opened = ::open("/dev/null", O_RDONLY);
        if (opened < 0) {
            opened = ::open("/", O_RDONLY | O_DIRECTORY);
        }
        if (opened != descriptor) {
            return false;
        }
    }
    return true;
}

}  // namespace marrowdale::host
