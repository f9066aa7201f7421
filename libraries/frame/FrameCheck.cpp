// SPDX-License-Identifier: Apache-2.0
#include "frame/FrameCheck.h"

namespace neuralWarp {
namespace {

FrameCheck enoughDeltas(std::size_t has, std::size_t needed) {
    return {has >= needed ? FrameFault::none : FrameFault::tooFewDeltas, has, needed};
}

} // namespace

FrameCheck checkOutputs(const FrameModel& model, std::size_t outputCount) {
    if (outputCount == 0)
        return {FrameFault::noOutputs};
    if (!model.shapes.isUsed())
        return enoughDeltas(outputCount / 3, model.slotCount);
    const auto shapes = static_cast<std::size_t>(model.shapes.shapeCount);
    if (outputCount < shapes)
        return {FrameFault::tooFewCoefficients, outputCount, shapes};
    return enoughDeltas(model.shapes.coveredSlots(), model.slotCount);
}

bool areEnoughForAllSlots(const FrameModel& model, std::size_t outputCount) {
    if (checkOutputs(model, outputCount).fault != FrameFault::none)
        return false;
    return !model.shapes.isUsed() ||
           (model.shapes.coveredSlots() >= model.shapes.slotCount && model.shapes.slotCount >= model.slotCount);
}

} // namespace neuralWarp
