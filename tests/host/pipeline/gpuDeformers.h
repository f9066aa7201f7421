// SPDX-License-Identifier: Apache-2.0
// The GPU version of "testDeformer", whose parts a test can replace.
#pragma once

#include "openquarn/gpu/HGPUDeformerRegistrationInfo.h"
#include "openquarn/gpu/HPxGPUStandardDeformer.h"

#include <atomic>
#include <functional>
#include <string>

namespace gpuDeformers {

/// Registers, with the session that is open, a GPU deformer for "testDeformer" that does what testDeformers::pushPoints
/// does; its kernels come from `folder`, into which they are written.
void registerPush(const std::string& folder);

/// What the deformers have done since reset(); they count side by side.
struct Seen {
    static inline std::atomic<int> alive = 0;       ///< objects that exist
    static inline std::atomic<int> evaluations = 0; ///< of all variants
    static inline std::atomic<int> terminations = 0;
    static void reset() { evaluations = terminations = 0; }
};

using Status = HPxGPUDeformer::DeformerStatus;

/// Replaces parts of the deformers and of the registration info; empty: the usual.
struct Hooks {
    std::function<HPxGPUDeformer*()> create;
    /// Instead of the kernels, in between of what comes before and after.
    std::function<Status(HPxGPUStandardDeformer&, const HGPUDeformerData&, HDataBlock&)> deform;
    std::function<void(const HPxGPUDeformer&)> terminate; ///< beside what it does
    std::function<bool(HStringArray*)> validateGraph, validateValues;
    std::function<HObject(const HObject&)> outputMesh, passThroughMesh;
    std::function<void(const HObject&, HObjectArray&)> additional;
    bool matchesIndices = true, isGeometryFilter = true;
};
inline Hooks hooks;

/// The pushing kernel's standard deformer.
HPxGPUDeformer* makePush();

} // namespace gpuDeformers
