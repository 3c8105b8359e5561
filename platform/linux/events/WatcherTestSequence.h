#pragma once

#include <fstream>
#include <map>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "platform/linux/events/Watcher.h"

namespace marrowdale::native {

// A case of what a watcher has to tell, as written in a file (sequences/README.md), for tests. What
// can't be read throws std::runtime_error, naming the line.
struct WatcherTestSequence {
    using Words = std::vector<std::string>;

    struct Expectation {
        bool isFile = false;
        std::string folder;  // the file, where isFile
        std::string name;    // empty: the folder itself
        std::uint32_t bits = 0;
        bool knowsOrigin = false;  // the two below count; both empty: none may be told
        std::string fromFolder;
        std::string fromName;
    };

    std::vector<Words> before;
    std::vector<Words> watched;  // "root", "watch" or "watchfile", and the path
    std::vector<Words> steps;    // operations, and "drain"
    std::vector<Expectation> expected;
    std::vector<std::pair<std::string, std::string>> allowed;  // folder, name

    // `kind`: "fanotify" or "inotify".
    static WatcherTestSequence read(const std::string& path, const std::string& kind) {
        WatcherTestSequence sequence;
        std::ifstream file(path);
        std::string line;
        while (std::getline(file, line)) {
            Words words = split(line);
            if (words.empty() || words[0].starts_with('#')) {
                continue;
            }
            const bool ofOneKind = words[0].ends_with(':');
            if (ofOneKind && words[0] != kind + ":") {
                continue;
            }
            words.erase(words.begin(), words.begin() + (ofOneKind ? 1 : 0));
            if (!sequence.take(words)) {
                throw std::runtime_error(path + ": " + line);
            }
        }
        if (sequence.watched.empty() || sequence.steps.empty()) {
            throw std::runtime_error(path + ": nothing is watched or nothing is done");
        }
        return sequence;
    }

  private:
    static Words split(const std::string& line) {
        std::istringstream stream(line);
        Words words;
        for (std::string word; stream >> word;) {
            words.push_back(unescaped(word));
        }
        return words;
    }

    static std::string unescaped(const std::string& word) {
        std::string bytes;
        for (std::size_t i = 0; i < word.size(); ++i) {
            if (word[i] == '%') {
                bytes += static_cast<char>(std::stoi(word.substr(i + 1, 2), nullptr, 16));
                i += 2;
            } else {
                bytes += word[i];
            }
        }
        return bytes;
    }

    static std::uint32_t bitsOf(const std::string& text) {
        static const std::map<std::string, std::uint32_t> bits{
            {"changed", WatchHint::changed}, {"appeared", WatchHint::appeared},
            {"gone", WatchHint::gone},       {"movedFrom", WatchHint::movedFrom},
            {"movedTo", WatchHint::movedTo}, {"rootMoved", WatchHint::rootMoved},
        };
        std::uint32_t all = 0;
        std::istringstream stream(text);
        for (std::string name; std::getline(stream, name, '+');) {
            all |= bits.at(name);
        }
        return all;
    }

    static std::string nameOf(const std::string& word) { return word == "." ? "" : word; }

    bool take(const Words& words) {
        const std::string& kind = words[0];
        const Words rest(words.begin() + 1, words.end());
        if (kind == "before" && !rest.empty()) {
            before.push_back(rest);
        } else if (kind == "do" && !rest.empty()) {
            steps.push_back(rest);
        } else if (kind == "drain" && rest.empty()) {
            steps.push_back(words);
        } else if ((kind == "root" || kind == "watch" || kind == "watchfile") && rest.size() == 1) {
            watched.push_back(words);
        } else if (kind == "may" && rest.size() == 2) {
            allowed.emplace_back(rest[0], nameOf(rest[1]));
        } else if (kind == "expectfile" && rest.size() == 2) {
            expected.push_back({true, rest[0], {}, bitsOf(rest[1]), false, {}, {}});
        } else if (kind == "expect" && rest.size() >= 3) {
            return expect(rest);
        } else {
            return false;
        }
        return true;
    }

    bool expect(const Words& rest) {
        Expectation one{false, rest[0], nameOf(rest[1]), bitsOf(rest[2]), rest.size() > 3, {}, {}};
        const bool fromNowhere = rest.size() == 5 && rest[4] == "nowhere";
        if (rest.size() == 6) {
            one.fromFolder = rest[4];
            one.fromName = rest[5];
        }
        expected.push_back(one);
        return rest.size() == 3 || (rest[3] == "from" && (fromNowhere || rest.size() == 6));
    }
};

}  // namespace marrowdale::native
