// SPDX-License-Identifier: Apache-2.0
// How long frames took. 12 bytes a frame are kept: the percentiles are exact.
#pragma once

#include <cstddef>
#include <vector>

namespace quarn {

class FrameTimes {
public:
    void add(int frame, double seconds);

    std::size_t count() const { return seconds_.size(); }
    /// Of all frames together, in seconds.
    double total() const;
    /// The time that the given part (0 to 1) of the frames did not exceed: the smallest such time that was measured.
    /// 0 without frames.
    double percentile(double part) const;
    double median() const { return percentile(0.5); }
    /// The frame that took longest; the first of several.
    int worstFrame() const;

private:
    std::vector<int> frames_;
    std::vector<double> seconds_;
};

/// The same for any list of times.
double percentileOf(std::vector<double> seconds, double part);

} // namespace quarn
