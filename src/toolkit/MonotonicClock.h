#pragma once

#include <ctime>

// Seconds of the monotonic clock (CLOCK_MONOTONIC), unaffected by changes of the wall time.
inline double MonotonicSeconds() {
    timespec now{};
    clock_gettime(CLOCK_MONOTONIC, &now);
    return double(now.tv_sec) + now.tv_nsec * 1e-9;
}
