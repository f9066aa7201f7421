// SPDX-License-Identifier: Apache-2.0
// A deformer of the scene, with the plugs that the commands of quarn need.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"

#include <string>
#include <vector>

namespace quarn {

/// A geometry that the deformer deforms.
struct WarpGeometry {
    unsigned index = 0; ///< the logical index in outputGeom, models, export, train ...
    std::string name;   ///< of the mesh node that the geometry comes from; "geometryINDEX" when there is none
    HPlug input;        ///< what is connected into input[index].inputGeometry, or that plug itself
    HPlug original;     ///< originalGeometry[index]
    HPlug output;       ///< outputGeom[index]
    HPlug target;       ///< what is connected into targetGeometry[index]; null without one
};

/// Thread: main. Errors are std::runtime_error with the sentence for the user.
struct Warp {
    HObject node;
    std::string name;
    std::vector<WarpGeometry> geometries; ///< by rising index

    /// The deformer of that name, or the only one of the scene when `name` is empty. Throws, naming the deformers that
    /// there are, when it is none or the choice is not clear.
    static Warp find(const std::string& name = {});

    /// By its index in decimal or by its name; with an empty text the only one. Throws, naming what there is.
    const WarpGeometry& geometry(const std::string& text) const;

    /// "models[INDEX].modelActive" and the like.
    HPlug plug(const std::string& path) const;
    /// The same of the element of a geometry: plug("train", geometry, "batchSize").
    HPlug plug(const std::string& array, const WarpGeometry& geometry, const std::string& child) const;
};

/// The mesh node that a chain of deformers begins with, which gives out this plug: upwards by the geometry that each
/// one gets, through point caches as well. Null when there is none. Thread: main.
HObject meshBehind(const HPlug& geometry);

} // namespace quarn
