#include "platform/linux/streams/StreamHub.h"

#include <algorithm>
#include <string>
#include <system_error>
#include <utility>

#include "platform/foundation/FatalError.h"
#include "platform/linux/streams/StreamCore.h"

namespace marrowdale::native {

void StreamHub::open(EventHistory& history) {
    {
        const MutexLock lock(mutex_);
        history_ = &history;
    }
    source_ = &history;
    try {
        thread_ = std::thread([this] { serve(); });
    } catch (const std::system_error& error) {
        fatalError(std::string("no thread for the event streams: ") + error.what());
    }
    listener_ = history.addListener([this](EventHistory::News news) { take(news); });
}

void StreamHub::close() {
    bool historyCloses = false;
    {
        const MutexLock lock(mutex_);
        historyCloses = historyCloses_;
    }
    if (!historyCloses) {
        source_->removeListener(listener_);
    }
    {
        const MutexLock lock(mutex_);
        closing_ = true;
    }
    changed_.notify_one();
    thread_.join();
}

EventHistory* StreamHub::enter() {
    const MutexLock lock(mutex_);
    ++users_;
    return history_;
}

void StreamHub::leave() {
    const MutexLock lock(mutex_);
    if (--users_ == 0) {
        unused_.notify_all();
    }
}

void StreamHub::add(const std::shared_ptr<StreamCore>& stream) {
    const MutexLock lock(mutex_);
    if (history_ != nullptr) {
        streams_.insert(stream);
    }
}

void StreamHub::remove(const std::shared_ptr<StreamCore>& stream) {
    const MutexLock lock(mutex_);
    streams_.erase(stream);
    due_.erase(stream);
}

void StreamHub::schedule(const std::shared_ptr<StreamCore>& stream, TimePoint when) {
    const MutexLock lock(mutex_);
    if (!streams_.contains(stream)) {
        return;
    }
    const auto [entry, isNew] = due_.emplace(stream, when);
    entry->second = std::min(entry->second, when);
    changed_.notify_one();
}

void StreamHub::take(EventHistory::News news) {
    const MutexLock lock(mutex_);
    switch (news) {
        case EventHistory::News::committed:
            committed_ = true;
            break;
        case EventHistory::News::broken:
            broken_ = true;
            break;
        case EventHistory::News::closing:
            closing_ = true;
            historyCloses_ = true;
            break;
    }
    if (closing_ || !streams_.empty()) {
        changed_.notify_one();
    }
}

void StreamHub::serve() {
    while (true) {
        const Work work = waitForWork();
        if (work.closing) {
            break;
        }
        pass(work);
    }
    letGoOfHistory();
}

bool StreamHub::hasWork() const {
    return closing_ || ((committed_ || broken_) && !streams_.empty());
}

StreamHub::Work StreamHub::waitForWork() {
    const MutexLock lock(mutex_);
    const auto isEarlier = [](const auto& a, const auto& b) { return a.second < b.second; };
    while (!hasWork()) {
        const auto next = std::ranges::min_element(due_, isEarlier);
        if (next == due_.end()) {
            changed_.wait(mutex_);
        } else if (next->second <= std::chrono::steady_clock::now()) {
            break;
        } else {
            const TimePoint when = next->second;
            (void)changed_.wait_until(mutex_, when);
        }
    }
    Work work;
    work.committed = std::exchange(committed_, false);
    work.broken = std::exchange(broken_, false);
    work.closing = closing_;
    if (work.committed || work.broken) {
        work.streams.assign(streams_.begin(), streams_.end());
    }
    const TimePoint now = std::chrono::steady_clock::now();
    for (auto entry = due_.begin(); entry != due_.end();) {
        if (entry->second <= now) {
            work.due.push_back(entry->first);
            entry = due_.erase(entry);
        } else {
            ++entry;
        }
    }
    return work;
}

void StreamHub::pass(const Work& work) {
    for (const auto& stream : work.due) {
        stream->post();
    }
    const TimePoint now = std::chrono::steady_clock::now();
    for (const auto& stream : work.streams) {
        if (const auto wait = stream->noteNews(work.broken)) {
            schedule(stream, now + *wait);
        }
    }
}

void StreamHub::letGoOfHistory() {
    std::set<std::shared_ptr<StreamCore>> streams;
    {
        const MutexLock lock(mutex_);
        history_ = nullptr;
        while (users_ > 0) {
            unused_.wait(mutex_);
        }
        streams.swap(streams_);
        due_.clear();
    }
    for (const auto& stream : streams) {
        stream->historyIsGone();
    }
}

}  // namespace marrowdale::native
