// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/valueAt.h"

#include "quarn/scene/PoseControls.h"

#include <cmath>
#include <stdexcept>

namespace quarn {

double valueAt(OpenQuarn::EvaluationContext& context, const HPlug& plug, int frame) {
    HStatus status;
    const double value = context.evaluateAt(plug, &status).asDouble();
    const auto where = [&] { return writtenName(plug) + " at frame " + std::to_string(frame); };
    if (status.error())
        throw std::runtime_error(where() + " could not be evaluated: " + status.errorString().asChar());
    if (!std::isfinite(value))
        throw std::runtime_error(where() + " is no finite number");
    return value;
}

} // namespace quarn
