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
    static std::atomic<int> alive;       ///< objects that exist
    static std::atomic<int> evaluations; ///< of all variants
    static std::atomic<int> terminations;
    static void reset();
};

using Status = HPxGPUDeformer::DeformerStatus;

/// Replaces parts of the deformers and of the registration info; empty: the usual.
struct Hooks {
    static std::function<HPxGPUDeformer*()> create;
    /// Instead of the kernels, in between of what comes before and after.
    static std::function<Status(HPxGPUStandardDeformer&, const HGPUDeformerData&, HDataBlock&)> deform;
    static std::function<void(const HPxGPUDeformer&)> terminate; ///< beside what it does
    static std::function<bool(HStringArray*)> validateGraph, validateValues;
    static std::function<HObject(const HObject&)> outputMesh, passThroughMesh;
    static std::function<void(const HObject&, HObjectArray&)> additional;
    static bool matchesIndices, isGeometryFilter;
    static void reset();
};

/// The pushing kernel's standard deformer.
HPxGPUDeformer* makePush();

} // namespace gpuDeformers
