// SPDX-License-Identifier: Apache-2.0
// Which of a node's published buffers are on the device already.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HUintArray.h"

class HPxGPUDeformer;

namespace deformer_utils {

/// Compares the versions that a node publishes, as the buffer "Sync" (HPxDeformerNode::getNamedBuffer), with those of
/// what was uploaded last. One version a slot; what belongs to a slot is the node's own affair. `[eval]` throughout.
class OPENQUARN_API SourceNodeSyncState {
public:
    /// Reads the versions of the deformer's node. A node that publishes none has none: everything is dirty.
    void capture(const HPxGPUDeformer& deformer);
    /// Any slot is dirty.
    bool isDirty() const;
    /// The slot's version was not captured, or is another one than what was uploaded.
    bool isDirty(unsigned slot) const;

    HUintArray uploaded; ///< versions of what is on the device; for the deformer to take over from `captured`
    HUintArray captured;
};

} // namespace deformer_utils
