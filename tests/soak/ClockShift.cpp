// Loaded before a program's own libraries (LD_PRELOAD), shifts what it is told of the time of day
// by the nanoseconds that stand in the file MARROWDALE_CLOCK_SHIFT, at each question anew. Clocks
// that only count are left alone, and so is the time that the kernel writes beside files.

#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <ctime>
#include <dlfcn.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/time.h>
#include <unistd.h>

namespace {

constexpr std::int64_t second = 1'000'000'000;

const std::atomic<std::int64_t>* mappedShift() {
    const char* path = std::getenv("MARROWDALE_CLOCK_SHIFT");  // NOLINT(concurrency-mt-unsafe)
    const int file = path != nullptr ? ::open(path, O_RDONLY | O_CLOEXEC) : -1;
    if (file < 0) {
        return nullptr;
    }
    void* const mapped = ::mmap(nullptr, sizeof(std::int64_t), PROT_READ, MAP_SHARED, file, 0);
    ::close(file);
    return mapped == MAP_FAILED ? nullptr : static_cast<const std::atomic<std::int64_t>*>(mapped);
}

std::int64_t shift() {
    static const auto* const shared = mappedShift();
    return shared != nullptr ? shared->load() : 0;
}

void addShift(timespec& time) {
    const std::int64_t nanoseconds = time.tv_nsec + shift() % second;
    time.tv_sec += shift() / second + (nanoseconds >= second ? 1 : 0) - (nanoseconds < 0 ? 1 : 0);
    time.tv_nsec = (nanoseconds + second) % second;
}

}  // namespace

// NOLINTBEGIN(readability-inconsistent-declaration-parameter-name): the system's names are its own
extern "C" __attribute__((visibility("default"))) int clock_gettime(clockid_t clock,
                                                                    timespec* time) noexcept {
    using Call = int (*)(clockid_t, timespec*);
    static const auto real = reinterpret_cast<Call>(::dlsym(RTLD_NEXT, "clock_gettime"));
    const int result = real(clock, time);
    if (result == 0 && (clock == CLOCK_REALTIME || clock == CLOCK_REALTIME_COARSE)) {
        addShift(*time);
    }
    return result;
}

extern "C" __attribute__((visibility("default"))) time_t time(time_t* out) noexcept {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    if (out != nullptr) {
        *out = now.tv_sec;
    }
    return now.tv_sec;
}

extern "C" __attribute__((visibility("default"))) int gettimeofday(timeval* out, void*) noexcept {
    timespec now{};
    ::clock_gettime(CLOCK_REALTIME, &now);
    out->tv_sec = now.tv_sec;
    out->tv_usec = now.tv_nsec / 1000;
    return 0;
}
// NOLINTEND(readability-inconsistent-declaration-parameter-name)
