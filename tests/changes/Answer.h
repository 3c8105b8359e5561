#pragma once

#include <map>
#include <set>
#include <string>
#include <vector>

#include "platform/hostframework/FileProviderEnumeration.h"

namespace marrowdale::tests {

// What the calls of one request come to: no identifier is told both as gone and as there. The later
// word counts; the deletion of a file's number is a word on the item that has the number.
class Answer {
  public:
    void update(const std::vector<FileProviderItemPtr>& items);
    void remove(const std::vector<std::string>& identifiers);

    std::map<std::string, FileProviderItemPtr> updated;
    std::set<std::string> deleted;  // applied first
};

}  // namespace marrowdale::tests
