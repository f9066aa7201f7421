// SPDX-License-Identifier: Apache-2.0
// What can be learned from control values without training.
#pragma once

#include <memory>
#include <span>
#include <vector>

namespace quarn {

/// Predicts whatever goes with rows of controls by kernel ridge regression (Saunders, Gammerman and Vovk 1998): a plane
/// through the rows and bumps of Gauss around them, in closed form. A prediction is a weighted sum of what the rows
/// have, with weights that depend on the controls alone, so that one fit does for any number of outputs.
class ControlFit {
public:
    /// `rows` of the same length, at least one; brought to the range that each control has in them.
    explicit ControlFit(const std::vector<std::vector<float>>& rows);
    ~ControlFit();
    ControlFit(const ControlFit&) = delete;
    ControlFit& operator=(const ControlFit&) = delete;

    /// The weight of each row for these controls.
    std::vector<float> weights(std::span<const float> controls) const;

private:
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

} // namespace quarn
