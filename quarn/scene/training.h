// SPDX-License-Identifier: Apache-2.0
// Training settings of a deformer that are worth beginning with.
#pragma once

class HPlug;

namespace quarn {

/// For an element of a deformer's `train`: each of these that is the attribute's default, and not connected, gets the
/// value that was best for a hand, an arm and a face (docs/quality.md): batchSize 32, learningRate 0.003,
/// validationRatio 0.1, principalShapesAccuracy 0.99999, principalShapesLimit 200. Everything else stays. Throws
/// std::runtime_error, naming the plug. Thread: main.
void setGoodTraining(const HPlug& train);

} // namespace quarn
