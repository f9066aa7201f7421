// SPDX-License-Identifier: Apache-2.0
#include "openquarn/gpu/SourceNodeSyncState.h"

#include "core/Operations.h"
#include "gpu/publishedBuffer.h"
#include "openquarn/TapiCastAnim.h"
#include "openquarn/gpu/HPxGPUDeformer.h"

using OpenQuarn::isRefused;
using OpenQuarn::Operation;

namespace deformer_utils {

void SourceNodeSyncState::capture(const HPxGPUDeformer& deformer) {
    if (isRefused(Operation::SourceNodeSyncState_capture))
        return;
    const HObject published = OpenQuarn::publishedBuffer(deformer.dependencyNode(), "Sync", deformer.multiIndex());
    const TuInt32Array* versions = TapiCastAnim::uInt32Array(published);
    captured.clear();
    for (std::size_t slot = 0; versions && slot < versions->length(); ++slot)
        captured.append((*versions)[slot]);
}

bool SourceNodeSyncState::isDirty() const {
    if (isRefused(Operation::SourceNodeSyncState_isDirty) || captured.length() == 0 ||
        captured.length() != uploaded.length())
        return true;
    for (unsigned slot = 0; slot < captured.length(); ++slot)
        if (isDirty(slot))
            return true;
    return false;
}

bool SourceNodeSyncState::isDirty(unsigned slot) const {
    return isRefused(Operation::SourceNodeSyncState_isDirty) || slot >= captured.length() ||
           slot >= uploaded.length() || captured[slot] != uploaded[slot];
}

} // namespace deformer_utils
