#include "host/browser/Sessions.h"

#include <algorithm>

#include "host/browser/Secrets.h"

namespace marrowdale::host {

std::string Sessions::newLaunch() {
    const MutexLock lock(mutex_);
    if (launches_.size() == mostLaunches) {
        launches_.pop_front();
    }
    return launches_.emplace_back(newSecret());
}

std::optional<Sessions::Session> Sessions::begin(std::string_view launch, std::string_view client) {
    const MutexLock lock(mutex_);
    const auto found = std::ranges::find_if(
        launches_, [&](const std::string& known) { return areSameSecret(known, launch); });
    if (found == launches_.end()) {
        return std::nullopt;
    }
    launches_.erase(found);
    if (entries_.size() == mostSessions) {
        endUnusedForLongest();
    }
    const Date now = Date::now();
    Session session{++lastNumber_, newSecret(), std::string(client), now, now};
    entries_.push_back({session, std::stop_source()});
    return session;
}

void Sessions::endUnusedForLongest() {
    const auto oldest = std::ranges::min_element(
        entries_, {}, [](const Entry& entry) { return entry.session.lastUsed; });
    oldest->ending.request_stop();
    entries_.erase(oldest);
}

std::optional<std::uint64_t> Sessions::numberOf(std::string_view token) {
    const MutexLock lock(mutex_);
    const auto found = std::ranges::find_if(
        entries_, [&](const Entry& entry) { return areSameSecret(entry.session.token, token); });
    if (found == entries_.end()) {
        return std::nullopt;
    }
    found->session.lastUsed = Date::now();
    return found->session.number;
}

std::stop_token Sessions::endOf(std::uint64_t number) {
    const MutexLock lock(mutex_);
    for (const Entry& entry : entries_) {
        if (entry.session.number == number) {
            return entry.ending.get_token();
        }
    }
    std::stop_source ended;
    ended.request_stop();
    return ended.get_token();
}

bool Sessions::has(std::uint64_t number) {
    return !endOf(number).stop_requested();
}

std::vector<Sessions::Session> Sessions::all() {
    const MutexLock lock(mutex_);
    std::vector<Session> sessions;
    sessions.reserve(entries_.size());
    for (const Entry& entry : entries_) {
        sessions.push_back(entry.session);
    }
    return sessions;
}

bool Sessions::end(std::uint64_t number) {
    std::stop_source ending(std::nostopstate);
    {
        const MutexLock lock(mutex_);
        const auto found = std::ranges::find_if(
            entries_, [&](const Entry& entry) { return entry.session.number == number; });
        if (found == entries_.end()) {
            return false;
        }
        ending = found->ending;
        entries_.erase(found);
    }
    ending.request_stop();
    return true;
}

}  // namespace marrowdale::host
