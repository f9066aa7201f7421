// SPDX-License-Identifier: Apache-2.0
#include "deformer/checkOutputs.h"

namespace neuralWarp {
namespace {

OutputCheck enoughDeltas(std::size_t has, std::size_t needed) {
    return {has >= needed ? Outputs::kEnough : Outputs::kTooFewDeltas, has, needed};
}

/// How many slots the basis has values for, whatever its counts say.
std::size_t coveredSlots(const neuralWarpData& data) {
    return data.principalShapes.size() / 3 / static_cast<std::size_t>(data.principalShapeCount);
}

} // namespace

bool usesPrincipalShapes(const neuralWarpData& data) {
    return data.principalShapeCount != 0 && data.principalVertCount != 0;
}

OutputCheck checkOutputs(const neuralWarpData& data, std::size_t outputCount) {
    if (outputCount == 0)
        return {Outputs::kNone};
    if (!usesPrincipalShapes(data))
        return enoughDeltas(outputCount / 3, data.slotCount());
    const auto shapes = static_cast<std::size_t>(data.principalShapeCount);
    if (outputCount < shapes)
        return {Outputs::kTooFewCoefficients, outputCount, shapes};
    return enoughDeltas(coveredSlots(data), data.slotCount());
}

bool areEnoughForAllSlots(const neuralWarpData& data, std::size_t outputCount) {
    if (checkOutputs(data, outputCount).outcome != Outputs::kEnough)
        return false;
    return !usesPrincipalShapes(data) ||
           (coveredSlots(data) >= data.principalVertCount && data.principalVertCount >= data.slotCount());
}

} // namespace neuralWarp
