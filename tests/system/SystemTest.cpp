#include "tests/system/SystemTest.h"

#include <cstdlib>

namespace marrowdale::tests {

namespace {

// Readers refuse a lone surrogate, so the bytes travel through the reader as private characters
// that no test uses otherwise: U+E080 to U+E0FF.
std::string withPrivateCharacters(std::string_view line) {
    std::string text(line);
    // Steps over whole escapes, for a backslash may itself be escaped.
    for (std::size_t at = text.find('\\'); at != std::string::npos; at = text.find('\\', at + 2)) {
        if (text.compare(at, 4, "\\udc") == 0) {
            text.replace(at, 4, "\\ue0");
        }
    }
    return text;
}

std::string withBytes(std::string_view text) {
    std::string bytes;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const bool isPrivate = text[i] == '\xEE' && i + 2 < text.size() &&
                               (text[i + 1] == '\x82' || text[i + 1] == '\x83');
        if (isPrivate) {
            const unsigned high = text[i + 1] == '\x83' ? 0xC0 : 0x80;
            bytes += static_cast<char>(high | (static_cast<unsigned char>(text[i + 2]) & 0x3FU));
            i += 2;
        } else {
            bytes += text[i];
        }
    }
    return bytes;
}

void restoreBytes(Json& value) {
    if (value.is_string()) {
        value = withBytes(value.get<std::string>());
    } else if (value.is_structured()) {
        for (Json& part : value) {
            restoreBytes(part);
        }
    }
}

Arguments withJson(const Arguments& arguments) {
    Arguments all{"--json"};
    all.insert(all.end(), arguments.begin(), arguments.end());
    return all;
}

}  // namespace

Home::Home(const std::string& parent) : folder_(parent), root_(folder_.path("Documents")) {
    makeFolder(root_);
}

ChildOptions Home::command(const Arguments& arguments) const {
    ChildOptions options;
    options.arguments = {programFolder() + "/marrowdale"};
    options.arguments.insert(options.arguments.end(), arguments.begin(), arguments.end());
    options.variables = {{"HOME", folder_.path()}, {"TZ", "UTC"}};
    // Sanitizers are set up through the environment.
    for (const char* name : {"ASAN_OPTIONS", "UBSAN_OPTIONS", "TSAN_OPTIONS",
                             "ASAN_SYMBOLIZER_PATH", "LD_LIBRARY_PATH"}) {
        if (const char* value = std::getenv(name)) {  // NOLINT(concurrency-mt-unsafe)
            options.variables[name] = value;
        }
    }
    options.workingFolder = root_;
    return options;
}

ChildResult Home::run(const Arguments& arguments) const {
    return runChild(command(arguments));
}

std::vector<Json> Home::lines(const Arguments& arguments) const {
    const ChildResult result = run(withJson(arguments));
    EXPECT_EQ(result.exitCode, 0) << result.errors;
    EXPECT_EQ(result.errors, "");
    return parsedLines(result.output);
}

Json Home::line(const Arguments& arguments) const {
    const std::vector<Json> all = lines(arguments);
    EXPECT_EQ(all.size(), 1U);
    return all.empty() ? Json() : all.front();
}

Json Home::error(const Arguments& arguments, int exitCode) const {
    const ChildResult result = run(withJson(arguments));
    EXPECT_EQ(result.exitCode, exitCode) << result.errors;
    EXPECT_EQ(result.output, "");
    const std::vector<Json> all = parsedLines(result.errors);
    EXPECT_EQ(all.size(), 1U) << result.errors;
    return all.empty() ? Json::object() : all.front().at("error");
}

std::string Home::identifierOf(std::string_view name) const {
    return line({"id", document(name)}).value("itemIdentifier", "");
}

std::string Home::pathOf(const std::string& identifier) const {
    return line({"path", identifier}).value("path", "");
}

std::map<std::string, std::string> Home::namesByIdentifier(const std::string& item) const {
    std::map<std::string, std::string> names;
    for (const Json& value : lines({"ls", item})) {
        names.emplace(value.at("itemIdentifier"), value.at("filename"));
    }
    return names;
}

Json parsedLine(std::string_view line) {
    Json value = Json::parse(withPrivateCharacters(line));
    restoreBytes(value);
    return value;
}

std::vector<Json> parsedLines(std::string_view output) {
    std::vector<Json> values;
    for (auto end = output.find('\n'); end != std::string_view::npos; end = output.find('\n')) {
        values.push_back(parsedLine(output.substr(0, end)));
        output.remove_prefix(end + 1);
    }
    return values;
}

std::string text(const Json& value, const char* name) {
    return value.at(name).get<std::string>();
}

std::vector<std::string> field(const std::vector<Json>& values, const char* name) {
    std::vector<std::string> result;
    for (const Json& value : values) {
        result.push_back(text(value, name));
    }
    return result;
}

}  // namespace marrowdale::tests
