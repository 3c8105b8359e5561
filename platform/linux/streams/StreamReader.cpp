#include "platform/linux/streams/StreamReader.h"

#include <algorithm>
#include <cerrno>
#include <utility>

namespace marrowdale::native {

namespace {

// So that a stream to which little belongs gives way at times too.
constexpr std::size_t mostLookedAt = 4096;

}  // namespace

StreamReader::StreamReader(std::vector<std::string> paths, std::optional<DeviceID> device,
                           EventID since, Log* log)
    : paths_(std::move(paths)), device_(device), since_(since), log_(log), newest_(since) {}

StreamReader::Step StreamReader::next(EventHistory& history, bool broken) {
    Step step;
    if (phase_ == Phase::starting) {
        start(history, step);
    }
    if (ahead_) {
        step.batch.push_back(*std::exchange(ahead_, std::nullopt));
    }
    step.more = read(history, step);
    if (step.more) {
        return step;
    }
    if (phase_ == Phase::history) {
        endHistory(step);
    }
    if (broken) {
        newest_ = std::max(newest_, history.lastEventID());
        tell(FileEventFlag::kernelDropped, step);
        step.toldBroken = true;
    }
    return step;
}

StreamReader::Step StreamReader::close() {
    Step step;
    if (phase_ == Phase::starting || phase_ == Phase::history) {
        endHistory(step);
    }
    phase_ = Phase::closed;
    return step;
}

void StreamReader::start(EventHistory& history, Step& step) {
    phase_ = Phase::history;
    filter_.emplace(paths_, device_, history.roots(), history.device());
    const auto barrier = history.barrier();
    if (!barrier) {
        log(barrier.error());
    }
    historyEnd_ = barrier ? *barrier : history.lastEventID();
    // The anchor of whoever follows must not stay where it means nothing.
    newest_ = historyEnd_;
    std::uint32_t problem = problemOf(history.standingOf(since_));
    const bool goesOn = problem == 0;
    problem |= !barrier || !filter_->isRecorded() ? FileEventFlag::kernelDropped : 0U;
    if (goesOn) {
        openCursor(history, since_);
        problem |= cursor_ == nullptr ? FileEventFlag::kernelDropped : 0U;
    }
    if (cursor_ == nullptr) {
        openCursor(history, historyEnd_);
    }
    if (problem != 0) {
        tell(problem, step);
    }
}

std::uint32_t StreamReader::problemOf(EventHistory::Standing standing) const {
    switch (standing) {
        case EventHistory::Standing::good:
            return 0;
        case EventHistory::Standing::future:
            return FileEventFlag::eventIDsWrapped;
        case EventHistory::Standing::pruned:
        case EventHistory::Standing::lost:
            break;
    }
    return FileEventFlag::kernelDropped;
}

bool StreamReader::read(EventHistory& history, Step& step) {
    if (cursor_ == nullptr) {
        startOver(history, FileEventFlag::kernelDropped, step);
        return false;
    }
    for (std::size_t looked = 0; looked < mostLookedAt && step.batch.size() < batchSize; ++looked) {
        const auto event = cursor_->next();
        if (!event) {
            readFailed(history, event.error(), step);
            return false;
        }
        if (!*event) {
            return false;
        }
        auto taken = filter_->take(**event);
        if (phase_ == Phase::history && (*event)->id > historyEnd_) {
            endHistory(step);
            newest_ = (*event)->id;
            ahead_ = std::move(taken);
            return true;
        }
        newest_ = std::max(newest_, (*event)->id);
        if (taken) {
            step.batch.push_back(std::move(*taken));
        }
    }
    return true;
}

void StreamReader::readFailed(EventHistory& history, const Error& error, Step& step) {
    log(error);
    // What retention took away was not read in time.
    startOver(history,
              error.code == ENODATA ? FileEventFlag::userDropped : FileEventFlag::kernelDropped,
              step);
}

void StreamReader::startOver(EventHistory& history, std::uint32_t flags, Step& step) {
    newest_ = std::max(newest_, history.lastEventID());
    cursor_.reset();
    openCursor(history, newest_);
    tell(flags, step);
}

void StreamReader::openCursor(EventHistory& history, EventID since) {
    auto cursor = history.eventsSince(since);
    if (cursor) {
        cursor_ = std::move(*cursor);
    } else {
        log(cursor.error());
    }
}

void StreamReader::endHistory(Step& step) {
    phase_ = Phase::live;
    FileEvent done;
    // On a device's feed an anchor must not pass what the stream by path has seen.
    done.id = device_ ? since_ : newest_;
    done.flags = FileEventFlag::historyDone;
    step.batch.push_back(std::move(done));
}

void StreamReader::tell(std::uint32_t flags, Step& step) const {
    FileEvent event;
    event.id = device_ && phase_ == Phase::history ? since_ : newest_;
    event.flags = flags;
    step.batch.push_back(std::move(event));
}

void StreamReader::log(const Error& error) const {
    if (log_ != nullptr) {
        log_->error("history is told as dropped: " + error.description());
    }
}

}  // namespace marrowdale::native
