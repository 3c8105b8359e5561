#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace marrowdale::host {

// What a process was started with: its environment variables and its working folder. A value, so
// that a test makes one of its own. Any thread.
class Environment {
  public:
    // `workingFolder` is absolute.
    Environment(std::map<std::string, std::string, std::less<>> variables,
                std::string workingFolder);

    // That of this process, read once. Where the working folder is gone, "/" stands for it.
    [[nodiscard]] static Environment ofProcess();

    // The value; none for a variable that is unset or empty, which mean the same to us.
    [[nodiscard]] std::optional<std::string> variable(std::string_view name) const;
    [[nodiscard]] const std::string& workingFolder() const { return workingFolder_; }

    // The path itself when it is absolute, else that path below the working folder. By name alone.
    [[nodiscard]] std::string absolutePath(std::string_view path) const;

  private:
    std::map<std::string, std::string, std::less<>> variables_;
    std::string workingFolder_;
};

}  // namespace marrowdale::host
