#include "host/cli/DoctorCommand.h"

#include <algorithm>
#include <iterator>
#include <optional>

#include <fmt/format.h>

#include "host/daemon/Doctor.h"
#include "host/daemon/Mounts.h"
#include "host/requests/FeedJson.h"
#include "host/requests/HarmlessText.h"

namespace marrowdale::host {

namespace {

std::string_view colourOf(FindingStatus status) {
    switch (status) {
        case FindingStatus::ok:
            return "\x1B[32m";
        case FindingStatus::note:
            return "\x1B[33m";
        case FindingStatus::problem:
            return "\x1B[1;31m";
    }
    return {};
}

std::string findingLines(const Finding& finding, std::size_t width, ItemTable::Colour colour) {
    const bool isColoured = colour == ItemTable::Colour::terminal;
    std::string text =
        fmt::format("{}{:<7}{}  {:<{}}  {}\n", isColoured ? colourOf(finding.status) : "",
                    statusName(finding.status), isColoured ? "\x1B[0m" : "", finding.name, width,
                    harmlessLine(finding.message));
    if (!finding.advice.empty()) {
        text += fmt::format("{:<{}}  {}\n", "", 9 + width, harmlessLine(finding.advice));
    }
    return text;
}

void print(const std::vector<Finding>& findings, CommandContext& context) {
    std::size_t width = 0;
    for (const Finding& finding : findings) {
        width = std::max(width, finding.name.size());
    }
    for (const Finding& finding : findings) {
        if (context.json()) {
            context.output().writeLine(findingJson(finding));
        } else {
            context.output().write(findingLines(finding, width, context.colour()));
        }
    }
}

void append(std::vector<Finding>& findings, std::vector<Finding> more) {
    std::ranges::move(more, std::back_inserter(findings));
}

// What the provider's process tells; it is started for that where none runs.
std::expected<std::vector<Finding>, Failure> providerFindings(CommandContext& context) {
    const auto requests = context.requests();
    if (!requests) {
        return std::unexpected(requests.error());
    }
    auto findings = (*requests)->findings();
    if (!findings) {
        return std::unexpected(Failure::provider(findings.error()));
    }
    return std::move(*findings);
}

}  // namespace

void DoctorCommand::declareArguments(CLI::App& /*arguments*/) {}

Outcome DoctorCommand::run(CommandContext& context) {
    const auto root = context.rootPath();
    const auto state = context.stateFolder();
    std::vector<Finding> findings;
    if (root) {
        append(findings, rootFindings(*root));
    } else {
        findings.push_back({"root", FindingStatus::problem, root.error().message,
                            "Name a folder that can be read with --root."});
    }
    if (state) {
        findings.push_back(stateFinding(*state, root.value_or("")));
    } else {
        findings.push_back({"state", FindingStatus::problem, state.error().message, {}});
    }
    append(findings, machineFindings(context.environment()));
    const auto provider = providerFindings(context);
    if (provider) {
        append(findings, *provider);
    } else {
        append(findings,
               root ? listeningFindings(triedRecorder(*root), std::nullopt) : listeningFindings());
    }
    if (!provider && root && state) {
        findings.push_back({"provider", FindingStatus::problem, provider.error().message,
                            "Without this nothing can be listed; mend it first."});
    }
    print(findings, context);
    return provider ? Outcome() : std::unexpected(provider.error());
}

}  // namespace marrowdale::host
