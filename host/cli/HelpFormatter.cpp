#include "host/cli/HelpFormatter.h"

namespace marrowdale::host {

HelpFormatter::HelpFormatter() {
    label("SUBCOMMAND", "COMMAND");
    label("Positionals", "Arguments");
}

std::string HelpFormatter::make_option_name(const CLI::Option* option, bool isPositional) const {
    const std::string name = Formatter::make_option_name(option, isPositional);
    const auto comma = name.find(',');
    return comma == std::string::npos ? name
                                      : name.substr(0, comma) + ", " + name.substr(comma + 1);
}

std::string HelpFormatter::make_option_opts(const CLI::Option* option) const {
    const bool isNamed = option->nonpositional() && option->get_type_size() != 0;
    return isNamed ? " " + option->get_type_name() : "";
}

std::string HelpFormatter::make_option_desc(const CLI::Option* option) const {
    const std::string byDefault = option->get_default_str();
    return option->get_description() + (byDefault.empty() ? "" : " (default: " + byDefault + ")");
}

}  // namespace marrowdale::host
