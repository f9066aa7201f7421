// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/PosesInMotion.h"

#include "quarn/scene/plugs.h"

#include <exception>

namespace quarn {
namespace {

constexpr int inSteps = 0, straight = 1; // animCurve.interpolation

} // namespace

PosesInMotion::PosesInMotion() {
    for (const HObject& curve : nodesOfType("animCurve"))
        if (const HPlug plug = plugOf(curve, "interpolation");
            !plug.isLocked() && !plug.isDestination() && wholeNumberOf(plug) == inSteps) {
            setNumber(plug, straight);
            curves_.push_back(curve);
        }
}

PosesInMotion::~PosesInMotion() {
    try {
        for (const HObject& curve : curves_)
            setNumber(plugOf(curve, "interpolation"), inSteps);
    } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): set before, so it can be set
    }
}

} // namespace quarn
