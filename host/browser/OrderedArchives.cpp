#include "host/browser/OrderedArchives.h"

#include <algorithm>
#include <utility>

#include "host/browser/Secrets.h"

namespace marrowdale::host {

std::string OrderedArchives::add(Order order) {
    std::string secret = newSecret();
    const MutexLock lock(mutex_);
    entries_.push_back({secret, now_() + lifetime, std::move(order)});
    if (entries_.size() > most) {
        entries_.pop_front();
    }
    return secret;
}

std::optional<OrderedArchives::Order> OrderedArchives::find(std::string_view secret) {
    const MutexLock lock(mutex_);
    std::erase_if(entries_, [now = now_()](const Entry& entry) { return entry.end < now; });
    const auto found = std::ranges::find_if(
        entries_, [&](const Entry& entry) { return areSameSecret(entry.secret, secret); });
    return found == entries_.end() ? std::nullopt : std::optional(found->order);
}

}  // namespace marrowdale::host
