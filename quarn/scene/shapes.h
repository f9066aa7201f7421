// SPDX-License-Identifier: Apache-2.0
// The morph targets of a scene: geometries that a blendShape moves, each shape by a weight of its own.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"
#include "rig/ShapeDeltas.h"

#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// A geometry of a blendShape.
struct SceneShapes {
    struct Shape {
        std::string name;        ///< of the slider without its node, where one is connected; else "shapeINDEX"
        HPlug weight;            ///< of the node
        HPlug control;           ///< what moves it: the slider's value, or the weight itself
        double restWeight = 0.0; ///< the slider's default
        rig::ShapeDeltas deltas; ///< in the space of the world, none beyond the vertices of the mesh
    };
    std::string mesh; ///< name of the mesh node that the geometry comes from
    HPlug input;      ///< the mesh as it comes into the node
    HPlug output;     ///< outputGeom of the node
    std::vector<Shape> shapes;
};

/// Those whose weights are all there is to say of them, and that nothing else moves before: no combinations, and a
/// plain mesh as input. Throws std::runtime_error, naming node and shape, for lists that are damaged. Thread: main.
std::vector<SceneShapes> sceneShapes();

/// What the shape `index` of a blendShape does to a geometry of `vertices` vertices; nothing where it has no lists.
/// Throws the same. Thread: main.
rig::ShapeDeltas shapeDeltas(const HObject& node, unsigned geometry, unsigned index, std::size_t vertices);

} // namespace quarn
