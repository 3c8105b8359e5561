#pragma once

namespace marrowdale::host {

// Fills the numbers of standard input, output and error that this process was started without, so
// that no file opened later gets one of them and is taken for a place to write text to. Reading
// from a filled one finds the end at once, writing to one fails (EBADF). To be called before
// anything is opened. False when a number can't be filled; nothing may be opened then.
[[nodiscard]] bool fillStandardDescriptors();

}  // namespace marrowdale::host
