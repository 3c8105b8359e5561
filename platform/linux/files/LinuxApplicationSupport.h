#pragma once

#include <mutex>
#include <string>

#include "platform/services/ApplicationSupport.h"

namespace marrowdale::native {

// Small files of the program's own in the user's data folder. A file is written under a hidden
// name beside it, synced, and renamed into its place; what a killed writer left there is taken over
// by the next one.
class LinuxApplicationSupport final : public ApplicationSupport {
  public:
    // What is read at most.
    static constexpr std::size_t largestFile = std::size_t{64} << 20U;

    // `dataHome`: the folder for the user's data, absolute ($XDG_DATA_HOME, else ~/.local/share);
    // empty where the user has none.
    explicit LinuxApplicationSupport(std::string dataHome);

    std::vector<URL> applicationSupportDirectories() override;
    Expected<void> createDirectory(const URL& url) override;
    Expected<Data> read(const URL& url) override;
    Expected<void> replace(const URL& url, const Data& contents) override;

  private:
    const std::string dataHome_;
    std::mutex writing_;  // one writer at a time
};

}  // namespace marrowdale::native
