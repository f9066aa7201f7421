// SPDX-License-Identifier: Apache-2.0
// What the pipeline tells a GPU deformer of the geometry that it is about to evaluate.
#pragma once

#include "geometry/IndexMap.h"
#include "openquarn/gpu/HPxGPUDeformer.h"

#include <cstdint>
#include <memory>

struct HPxGPUDeformer::Impl {
    HObject node;
    unsigned multiIndex = 0;
    std::shared_ptr<const OpenQuarn::IndexMap> affected;
    const float* weights = nullptr; ///< of the affected vertices; null: all 1
    std::uint64_t weightsVersion = 0;
    bool isGeometryFilter = true; ///< has an envelope
};
