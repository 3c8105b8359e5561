// Lists the documents, then tells of every change until it is interrupted: what an indexer, a
// back-up tool or a second pane of a file browser does.
//
//     c++ -std=c++23 follow.cpp $(pkg-config --cflags --libs marrowdale) -o follow
//     marrowdale serve & ./follow

#include <cstdlib>
#include <iostream>
#include <map>
#include <marrowdale/client.h>
#include <string>
#include <vector>

namespace client = marrowdale::client;

namespace {

// The picture that this program has of the documents: items by their identifiers.
class Picture {
  public:
    // The anchor is taken before anything is listed, so that nothing is missed in between. A
    // listing under which something was deleted is begun again.
    client::Result<void> gather(client::Service& service) {
        while (true) {
            const auto anchor = service.anchor(client::workingSetContainer);
            if (!anchor) {
                return std::unexpected(anchor.error());
            }
            items_.clear();
            anchor_ = *anchor;
            const auto listed = list(service);
            if (listed || listed.error().name != "syncAnchorExpired") {
                return listed;
            }
        }
    }

    // Asks what changed, as often as there is more; an anchor that has expired means that the
    // documents are to be listed again.
    client::Result<void> follow(client::Service& service) {
        bool moreComing = true;
        while (moreComing) {
            const auto changes = service.changes(client::workingSetContainer, anchor_);
            if (!changes) {
                return changes.error().name == "syncAnchorExpired"
                           ? gather(service)
                           : client::Result<void>(std::unexpected(changes.error()));
            }
            for (const std::string& identifier : changes->deleted) {
                remove(identifier);
            }
            for (const client::Item& item : changes->updated) {
                std::cout << "changed " << item.path << '\n';
                items_[item.itemIdentifier] = item;
            }
            anchor_ = changes->anchor;
            moreComing = changes->moreComing;
        }
        std::cout << "now " << items_.size() << " items" << std::endl;
        return {};
    }

  private:
    client::Result<void> list(client::Service& service) {
        std::optional<std::string> next;
        do {
            auto page = service.page(client::allDirectoriesContainer, next);
            if (!page) {
                return std::unexpected(page.error());
            }
            for (client::Item& item : page->items) {
                items_[item.itemIdentifier] = std::move(item);
            }
            next = page->next;
        } while (next);
        return {};
    }

    // A deleted "fid=N" also means the item that is known by that file number, and with a folder
    // goes what is known in it.
    void remove(const std::string& identifier) {
        std::vector<std::string> folders;
        std::erase_if(items_, [&](const auto& entry) {
            const client::Item& item = entry.second;
            const bool isGone =
                item.itemIdentifier == identifier || item.parentItemIdentifier == identifier ||
                (item.fileID && "fid=" + std::to_string(*item.fileID) == identifier);
            if (isGone) {
                std::cout << "gone " << item.path << '\n';
            }
            if (isGone && item.isFolder && item.itemIdentifier != identifier) {
                folders.push_back(item.itemIdentifier);
            }
            return isGone;
        });
        for (const std::string& folder : folders) {
            remove(folder);
        }
    }

    std::map<std::string, client::Item> items_;
    std::string anchor_;
};

}  // namespace

int main() {
    auto service = client::Service::connect();
    if (!service) {
        std::cerr << service.error().message << '\n';
        return EXIT_FAILURE;
    }
    Picture picture;
    if (const auto gathered = picture.gather(*service); !gathered) {
        std::cerr << gathered.error().message << '\n';
        return EXIT_FAILURE;
    }
    const auto catchUp = [&] {
        if (const auto followed = picture.follow(*service); !followed) {
            std::cerr << followed.error().message << '\n';
        }
    };
    // What happened before the watch was ready is asked for once; after that, signals tell.
    const auto ended = service->watch({std::string(client::workingSetContainer)}, catchUp,
                                      [&](std::string_view) { catchUp(); }, {});
    std::cerr << ended.error().message << '\n';
    return EXIT_FAILURE;
}
