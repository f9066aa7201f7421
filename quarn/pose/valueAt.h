// SPDX-License-Identifier: Apache-2.0
// The number that a plug has in a frame.
#pragma once

#include "openquarn/HPlug.h"
#include "openquarn_app/Evaluation.h"

namespace quarn {

/// Evaluates the plug in the context, whose time is `frame`. Throws std::runtime_error, naming plug and frame, when it
/// fails or gives no finite number. Thread: main.
double valueAt(OpenQuarn::EvaluationContext& context, const HPlug& plug, int frame);

} // namespace quarn
