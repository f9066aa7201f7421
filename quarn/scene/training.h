// SPDX-License-Identifier: Apache-2.0
// Training settings of a deformer that are worth beginning with.
#pragma once

class HPlug;

namespace quarn {

/// For an element of a deformer's `train`, while its principalShapesAccuracy and principalShapesLimit are the
/// attributes' defaults: 0.99 and 200, with which shapes lose a hundredth of what they are to show, where the defaults
/// lose a fifth. Everything else stays. Throws std::runtime_error, naming the plug. Thread: main.
void setGoodTraining(const HPlug& train);

} // namespace quarn
