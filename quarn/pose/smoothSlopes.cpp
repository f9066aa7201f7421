// SPDX-License-Identifier: Apache-2.0
// Catmull-Rom slopes for uneven times, limited as in: F. N. Fritsch, R. E. Carlson, "Monotone Piecewise Cubic
// Interpolation", SIAM Journal on Numerical Analysis 17 (1980), section 4: a piece is monotone when both slopes are
// between 0 and 3 times the slope of its chord.
#include "quarn/pose/smoothSlopes.h"

#include <algorithm>
#include <cmath>

namespace quarn {

std::vector<double> smoothSlopes(const std::vector<double>& times, const std::vector<double>& values) {
    std::vector<double> slopes(values.size(), 0.0);
    for (std::size_t i = 1; i + 1 < values.size(); ++i) {
        const double before = (values[i] - values[i - 1]) / (times[i] - times[i - 1]);
        const double after = (values[i + 1] - values[i]) / (times[i + 1] - times[i]);
        if ((before > 0.0) != (after > 0.0) || before == 0.0 || after == 0.0)
            continue; // turns here, or is level on one side
        const double through = (values[i + 1] - values[i - 1]) / (times[i + 1] - times[i - 1]);
        const double steepest = 3.0 * std::min(std::abs(before), std::abs(after));
        slopes[i] = std::clamp(through, -steepest, steepest);
    }
    return slopes;
}

} // namespace quarn
