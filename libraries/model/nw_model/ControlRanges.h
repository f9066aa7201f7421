// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: the box of control values that a model was trained in.
#pragma once

#include <cstddef>
#include <span>
#include <vector>

namespace neuralWarp {

/// Least and largest value of every control over the rows that a model was trained on, and how far others are from
/// there. Immutable, so one object may be used by several threads at once.
class ControlRanges {
public:
    /// Of no control: everything is inside.
    ControlRanges() = default;
    /// Both [controls], in the controls' units: equally many finite numbers, no minimum above its maximum. Throws
    /// std::invalid_argument that names the control.
    ControlRanges(std::vector<float> minima, std::vector<float> maxima);

    std::size_t count() const { return minima_.size(); }
    float minimum(std::size_t control) const { return minima_[control]; }
    float maximum(std::size_t control) const { return maxima_[control]; }
    /// What lengths along a control are divided by, above 0 in its units: the width of its range, or, of one that
    /// hardly moved, a tenth of the root mean square of all widths, so that noise of such a one does not count as
    /// motion.
    double unit(std::size_t control) const { return units_[control]; }

    /// How far a value lies below the minimum (negative) or above the maximum (positive), in the control's units. 0
    /// inside, and where it is no more than rounding: a hundred-thousandth of unit(). A value that is no number is
    /// infinitely far outside.
    double excess(std::size_t control, float value) const;

    /// The largest excess of all controls, each in its unit(): 0 inside, 0.25 where the control that is furthest out is
    /// beyond by a quarter of its range. The largest, and not a sum: one control beyond is enough for the network to
    /// know nothing, and a rig with more controls is not further out for having them.
    /// `controls` as many as count(), in order; those that are missing count as inside, further ones do not count.
    double distance(std::span<const float> controls) const;

private:
    std::vector<float> minima_, maxima_;
    std::vector<double> units_;
};

} // namespace neuralWarp
