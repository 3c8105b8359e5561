#pragma once

#include <string>
#include <string_view>

namespace marrowdale::host {

// Standard output, gathered and written in large pieces. After the first failure nothing more is
// written. One thread.
class Output {
  public:
    // `descriptor` stays the caller's.
    explicit Output(int descriptor) : descriptor_(descriptor) {}

    void write(std::string_view text);
    void writeLine(std::string_view text) {
        write(text);
        write("\n");
    }
    // Writes what was gathered, so that a reader sees it now.
    void flush();

    // True once the reader has gone: there is nobody to write for any more, which is no error.
    [[nodiscard]] bool readerHasGone() const;
    // The errno of the first write that failed for another reason; 0 for none.
    [[nodiscard]] int error() const;
    [[nodiscard]] bool hasFailed() const { return code_ != 0; }

  private:
    int descriptor_;
    int code_ = 0;
    std::string pending_;
};

}  // namespace marrowdale::host
