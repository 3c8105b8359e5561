#include "platform/foundation/Error.h"

#include <system_error>

namespace marrowdale {

namespace {

std::string fileErrorText(int code) {
    switch (static_cast<FileErrorCode>(code)) {
        case FileErrorCode::noSuchFile:
            return "no such file";
        case FileErrorCode::writeNoPermission:
            return "writing is not permitted";
        case FileErrorCode::fileExists:
            return "a file of that name exists";
    }
    return "file error " + std::to_string(code);
}

std::string codeText(const Error& error) {
    if (error.domain == ErrorDomain::posix) {
        return std::generic_category().message(error.code);
    }
    if (error.domain == ErrorDomain::file) {
        return fileErrorText(error.code);
    }
    return std::string(error.domainName()) + " " + std::to_string(error.code);
}

}  // namespace

std::string_view Error::domainName() const {
    switch (domain) {
        case ErrorDomain::posix:
            return "OrbPOSIXErrorDomain";
        case ErrorDomain::file:
            return "OrbFileErrorDomain";
        case ErrorDomain::fileProvider:
            return "VantrelFileProviderErrorDomain";
        case ErrorDomain::provider:
            return "MarrowdaleErrorDomain";
    }
    return "UnknownErrorDomain";
}

std::string Error::description() const {
    std::string text;
    if (!operation.empty()) {
        text += "can't " + operation;
        if (!subject.empty()) {
            text += " \"" + subject + "\"";
        }
        text += ": ";
    } else if (!subject.empty()) {
        text += "\"" + subject + "\": ";
    }
    return text + codeText(*this);
}

Error errorWithPOSIXCode(int code) {
    return {ErrorDomain::posix, code, {}, {}};
}

Error errorWithPOSIXCode(int code, std::string_view operation, std::string_view subject) {
    return {ErrorDomain::posix, code, std::string(operation), std::string(subject)};
}

Error errorFileWriteNoPermission() {
    return {ErrorDomain::file, static_cast<int>(FileErrorCode::writeNoPermission), {}, {}};
}

}  // namespace marrowdale
