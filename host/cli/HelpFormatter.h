#pragma once

#include <string>

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>

namespace marrowdale::host {

// Writes `--help`: an option with what its value is called, and what it is by default in words.
class HelpFormatter final : public CLI::Formatter {
  public:
    HelpFormatter();
    [[nodiscard]] std::string make_option_name(const CLI::Option* option,
                                               bool isPositional) const override;
    [[nodiscard]] std::string make_option_opts(const CLI::Option* option) const override;
    [[nodiscard]] std::string make_option_desc(const CLI::Option* option) const override;
};

}  // namespace marrowdale::host
