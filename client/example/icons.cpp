// Lists the document libraries of applications and writes the icon of each into a folder: what the
// first column of a file browser is made of.
//
//     c++ -std=c++23 icons.cpp $(pkg-config --cflags --libs marrowdale) -o icons
//     marrowdale serve & ./icons /tmp

#include <fstream>
#include <iostream>
#include <marrowdale/client.h>
#include <span>
#include <string>

namespace client = marrowdale::client;

namespace {

client::Result<void> run(const std::string& folder) {
    auto service = client::Service::connect();
    if (!service) {
        return std::unexpected(service.error());
    }
    if (auto refreshed = service->refreshApplications(); !refreshed) {
        return refreshed;
    }
    const auto libraries = service->applications();
    if (!libraries) {
        return std::unexpected(libraries.error());
    }
    for (const client::Item& library : *libraries) {
        const auto picture = service->thumbnail(library.itemIdentifier);
        if (!picture) {
            return std::unexpected(picture.error());
        }
        const std::string bytes = picture->value_or("");
        const std::string file = folder + "/" + library.itemIdentifier + ".png";
        if (!(std::ofstream(file, std::ios::binary) << bytes)) {
            return std::unexpected(client::Error{{}, 0, "other", "can't write " + file});
        }
        std::cout << library.filename << '\t' << library.path << '\t' << bytes.size() << '\n';
    }
    return {};
}

}  // namespace

int main(int argumentCount, char** argumentValues) {
    const std::span arguments(argumentValues, static_cast<std::size_t>(argumentCount));
    if (arguments.size() != 2) {
        std::cerr << "usage: icons FOLDER\n";
        return 2;
    }
    if (const auto done = run(arguments[1]); !done) {
        std::cerr << done.error().message << '\n';
        return 1;
    }
    return 0;
}
