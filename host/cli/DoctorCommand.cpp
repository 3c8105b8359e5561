#include "host/cli/DoctorCommand.h"

#include <algorithm>
#include <iterator>
#include <optional>

#include <fmt/format.h>

#include "host/cli/JsonWriter.h"
#include "host/daemon/Doctor.h"
#include "host/daemon/HarmlessText.h"
#include "host/daemon/Mounts.h"

namespace marrowdale::host {

namespace {

std::string findingJson(const Finding& finding) {
    JsonWriter writer;
    writer.beginObject().key("finding").string(finding.name);
    writer.key("status").string(statusName(finding.status));
    writer.key("message").string(finding.message);
    if (!finding.advice.empty()) {
        writer.key("advice").string(finding.advice);
    }
    writer.endObject();
    return writer.take();
}

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

std::vector<Finding> worldFindings(const World& world) {
    const native::StoreReport report = world.storeReport();
    const std::string& root = world.settings().rootPath;
    std::vector<Finding> findings = listeningFindings(
        report.recorder.isLive ? report.recorder : triedRecorder(root), report.reconcile.folders);
    append(findings, storeFindings(report, mountsBelow(root)));
    append(findings, historyFindings(report, world.retention()));
    return findings;
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
    const auto world = context.world();
    if (world) {
        append(findings, worldFindings(**world));
    } else {
        append(findings,
               root ? listeningFindings(triedRecorder(*root), std::nullopt) : listeningFindings());
    }
    if (!world && root && state) {
        findings.push_back({"provider", FindingStatus::problem, world.error().message,
                            "Without this nothing can be listed; mend it first."});
    }
    print(findings, context);
    return world ? Outcome() : std::unexpected(world.error());
}

}  // namespace marrowdale::host
