#include <cerrno>

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "host/cli/Failure.h"
#include "platform/hostframework/FileProviderConstants.h"
#include "providers/marrowdale/items/ProviderError.h"

namespace marrowdale::host {
namespace {

nlohmann::json errorOf(const Failure& failure) {
    return nlohmann::json::parse(failure.json()).at("error");
}

TEST(FailureTest, anItemThatDoesNotExistIsNamed) {
    const Failure failure = Failure::provider(errorForNonExistentItem("did=9"));
    EXPECT_EQ(failure.exitCode, ExitCode::providerError);
    EXPECT_EQ(failure.line(), "marrowdale: no such item: did=9");
    const auto error = errorOf(failure);
    EXPECT_EQ(error["domain"], "VantrelFileProviderErrorDomain");
    EXPECT_EQ(error["code"], -1001);
    EXPECT_EQ(error["name"], "noSuchItem");
    EXPECT_EQ(error["itemIdentifier"], "did=9");
}

TEST(FailureTest, aPathWhereNothingIsServedIsToldAsItWasTyped) {
    const Failure failure = Failure::nothingAt("./none");
    EXPECT_EQ(failure.exitCode, ExitCode::providerError);
    EXPECT_EQ(failure.line(), "marrowdale: nothing is served at ./none");
    const auto error = errorOf(failure);
    EXPECT_EQ(error["name"], "noSuchItem");
    EXPECT_EQ(error["code"], -1001);
    EXPECT_EQ(error["path"], "./none");
    EXPECT_EQ(error["itemIdentifier"], "./none");
}

TEST(FailureTest, whoNamesAFileWithoutAFolderIsToldHowAPathBegins) {
    EXPECT_EQ(Failure::provider(errorForNonExistentItem("a.txt")).message,
              "no such item: a.txt (a path begins with \"/\", \"./\" or \"../\")");
}

TEST(FailureTest, eachKindHasItsName) {
    EXPECT_EQ(Failure::provider(errorSyncAnchorExpired()).name, "syncAnchorExpired");
    EXPECT_EQ(Failure::provider(errorFileWriteNoPermission()).name, "writeNoPermission");
    EXPECT_EQ(Failure::provider(errorWithPOSIXCode(ENOSPC)).name, "posix");
    EXPECT_EQ(
        Failure::provider(errorWithProviderCode(ProviderErrorCode::unableToGetDeviceUUID, "/x"))
            .name,
        "unableToGetDeviceUUID");
    EXPECT_EQ(Failure::provider(errorWithProviderCode(ProviderErrorCode::itemNotFound, "/x")).name,
              "other");
    EXPECT_EQ(Failure::provider({ErrorDomain::file, 260, "read", "/x"}).name, "other");
    const auto error = errorOf(Failure::provider(
        {ErrorDomain::fileProvider, static_cast<int>(FileProviderErrorCode::invalidParameter),
         "name", "a/b"}));
    EXPECT_EQ(error["name"], "invalidParameter");
    EXPECT_EQ(error["parameter"], "name");
    EXPECT_EQ(error["value"], "a/b");
}

TEST(FailureTest, failingToStartTellsTheSystemsErrorWhereThereIsOne) {
    const Failure system = Failure::start(StartFailure::system(EACCES, "can't read \"/x\""));
    EXPECT_EQ(system.exitCode, ExitCode::couldNotStart);
    EXPECT_EQ(errorOf(system)["name"], "posix");
    EXPECT_EQ(errorOf(system)["code"], EACCES);
    const Failure refusal = Failure::start(StartFailure::refusal("no"));
    EXPECT_EQ(refusal.exitCode, ExitCode::couldNotStart);
    EXPECT_EQ(errorOf(refusal)["name"], "other");
    EXPECT_EQ(refusal.line(), "marrowdale: no");
}

TEST(FailureTest, theLineForPeopleIsOneLine) {
    const Failure failure = Failure::provider(errorForNonExistentItem("did=\n\x1B[2J"));
    EXPECT_EQ(failure.line(), "marrowdale: no such item: did=\\n\\e[2J");
    EXPECT_EQ(errorOf(failure)["itemIdentifier"], "did=\n\x1B[2J");
}

}  // namespace
}  // namespace marrowdale::host
