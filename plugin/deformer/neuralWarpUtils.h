// SPDX-License-Identifier: Apache-2.0
// What the deformer, its GPU variant and the command share.
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/HDataBlock.h"
#include "openquarn/HStatus.h"

#include <cstdint>
#include <vector>

namespace neuralWarp {

/// The state of a geometry in a node's data; null when there is none. Makes nothing. Owned by the host. [eval]
neuralWarpData* fetchNodeData(HDataBlock& block, std::uint32_t multiIndex);

/// The evaluated value of an element of an array that exists, reached without evaluating its siblings; invalid, with a
/// failing status, when there is no such element. [eval]
HDataHandle existingElement(HDataBlock& block, const HObject& array, std::uint32_t multiIndex, HStatus& status);

/// Reads the first `inputCount` elements of `controlValues`, by position, into `controls`, as the step
/// FrameStep::gather. With fewer elements it shows both counts and fails; a failing host call is reported and returned.
/// [eval]
HStatus gatherControlValues(HDataBlock& block, std::int32_t inputCount, FrameObserver& observer,
                            std::vector<float>& controls);

/// Index of the profiling category "Evaluation". [any]
int evaluationCategory();

/// Reports a failure under a source unit (messages/sourceUnits.h), with the line of the caller; a success is not
/// reported. Returns the status. [any]
HStatus reported(const HStatus& status, const char* sourceUnit, int line = __builtin_LINE());

} // namespace neuralWarp
