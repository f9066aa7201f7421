// SPDX-License-Identifier: Apache-2.0
#include "rig/shapeWeights.h"

#include "rig/blendShapeNode.h"
#include "rig/listChecks.h"
#include "rig/texts.h"

#include <algorithm>
#include <cmath>
#include <map>
#include <string>

namespace rig {
namespace {

using Node = blendShapeNode;

HStatus readGiven(HDataBlock& block, std::vector<ShapeWeight>& weights) {
    HStatus status;
    HArrayDataHandle values = block.inputArrayValue(Node::weight, &status);
    const unsigned count = status.error() ? 0 : values.elementCount();
    weights.reserve(count);
    for (unsigned i = 0; i < count && !status.error(); ++i) {
        status = values.jumpToPosition(i);
        const unsigned shape = values.elementIndex();
        const double value = status.error() ? 0.0 : values.inputValue(&status).asDouble();
        if (!status.error() && !std::isfinite(value))
            status = wrong(element("weight", shape) + " is " + text(value));
        weights.push_back({shape, value});
    }
    return status;
}

/// The lists of a combination, by shape; without those that have no factors.
struct CombinationLists {
    std::vector<double> factors, ramps;
};
using Combinations = std::map<std::uint32_t, CombinationLists>;

HStatus readCombinations(HDataBlock& block, Combinations& combinations) {
    HStatus status;
    HArrayDataHandle elements = block.inputArrayValue(Node::combination, &status);
    const unsigned count = status.error() ? 0 : elements.elementCount();
    for (unsigned i = 0; i < count && !status.error(); ++i) {
        status = elements.jumpToPosition(i);
        const HDataHandle lists = status.error() ? HDataHandle() : elements.inputValue(&status);
        if (status.error())
            return status;
        CombinationLists read{HFnDoubleArrayData(lists.child(Node::factors).data()).values(),
                              HFnDoubleArrayData(lists.child(Node::ramps).data()).values()};
        if (!read.factors.empty())
            combinations.emplace(elements.elementIndex(), std::move(read));
    }
    return status;
}

HStatus checkFactors(const Combinations& combinations, const std::vector<double>& factors) {
    for (std::size_t i = 0; i < factors.size(); ++i)
        if (isIndex(factors[i]) && combinations.count(static_cast<std::uint32_t>(factors[i])) > 0)
            return wrong(element("factors", i) + " is " + text(factors[i]) + ", a shape that is combined itself");
    return HStatus::kSuccess;
}

HStatus combine(const Combinations& combinations, std::vector<ShapeWeight>& weights) {
    std::vector<ShapeWeight> made;
    for (const auto& [shape, lists] : combinations) {
        ShapeWeight& combined = made.emplace_back(ShapeWeight{shape, 0.0});
        HStatus status = checkFactors(combinations, lists.factors);
        if (!status.error())
            status = combineWeight({lists.factors, lists.ramps}, weights, combined.value);
        if (!status.error() && !std::isfinite(combined.value))
            status = wrong("the weight is " + text(combined.value));
        if (status.error())
            return wrong(element("combination", shape) + ": " + status.errorString().asStdString());
    }
    std::erase_if(weights, [&](const ShapeWeight& given) { return combinations.count(given.shape) > 0; });
    const auto middle = weights.insert(weights.end(), made.begin(), made.end());
    std::inplace_merge(weights.begin(), middle, weights.end(),
                       [](const ShapeWeight& a, const ShapeWeight& b) { return a.shape < b.shape; });
    return HStatus::kSuccess;
}

} // namespace

HStatus readShapeWeights(HDataBlock& block, std::vector<ShapeWeight>& weights) {
    weights.clear();
    Combinations combinations;
    HStatus status = readGiven(block, weights);
    if (!status.error())
        status = readCombinations(block, combinations);
    return status.error() || combinations.empty() ? status : combine(combinations, weights);
}

} // namespace rig
