// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/FrameTimes.h"

#include <algorithm>
#include <cmath>
#include <numeric>

namespace quarn {

void FrameTimes::add(int frame, double seconds) {
    frames_.push_back(frame);
    seconds_.push_back(seconds);
}

double FrameTimes::total() const {
    return std::accumulate(seconds_.begin(), seconds_.end(), 0.0);
}

double FrameTimes::percentile(double part) const {
    return percentileOf(seconds_, part);
}

int FrameTimes::worstFrame() const {
    if (frames_.empty())
        return 0;
    return frames_[static_cast<std::size_t>(std::max_element(seconds_.begin(), seconds_.end()) - seconds_.begin())];
}

double percentileOf(std::vector<double> seconds, double part) {
    if (seconds.empty())
        return 0.0;
    const double rank = std::ceil(part * static_cast<double>(seconds.size())); // nearest rank
    const auto nth = seconds.begin() + static_cast<std::ptrdiff_t>(std::max(rank, 1.0)) - 1;
    std::nth_element(seconds.begin(), nth, seconds.end());
    return *nth;
}

} // namespace quarn
