// Clock and statistics of the measurements.
#pragma once

#include <algorithm>
#include <chrono>
#include <ctime>
#include <vector>

namespace bench {

// Seconds that a call takes on the wall clock.
template <class Call>
double secondsOf(Call&& call) {
    const auto start = std::chrono::steady_clock::now();
    call();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

struct Timing {
    double wall;       // seconds
    double processor;  // seconds of all threads of this process together
};

// On a processor as device, the processor's time is what other programs on a busy machine disturb least.
template <class Call>
Timing timingOf(Call&& call) {
    const std::clock_t before = std::clock();
    const double wall = secondsOf(call);
    return {wall, static_cast<double>(std::clock() - before) / CLOCKS_PER_SEC};
}

// The upper median; 0 of nothing.
inline double median(std::vector<double> values) {
    if (values.empty()) return 0.0;
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

inline double minimum(const std::vector<double>& values) {
    return values.empty() ? 0.0 : *std::min_element(values.begin(), values.end());
}

}  // namespace bench
