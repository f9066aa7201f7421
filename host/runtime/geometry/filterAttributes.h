// SPDX-License-Identifier: Apache-2.0
// The attributes and classes of the nodes that hold and deform geometry.
#pragma once

#include "types/NodeClass.h"

namespace OpenQuarn {

/// Attributes of the geometry filter and of the deformer; see HPxGeometryFilter and HPxDeformerNode.
struct FilterAttributes {
    std::shared_ptr<Attribute> input, inputGeometry, componentTagExpression, originalGeometry, outputGeom, envelope;
    std::shared_ptr<Attribute> weightList, weights;
};
const FilterAttributes& filterAttributes();

/// "geometryFilter" and "deformer": what every type of these kinds has. Cannot be created by themselves.
std::shared_ptr<const NodeClass> geometryFilterClass();
std::shared_ptr<const NodeClass> deformerClass();

/// "mesh": holds a mesh. Its input "inMesh" is its output "outMesh".
std::shared_ptr<const NodeClass> meshClass();

/// Registers the classes above, once a process.
void registerGeometryNodes();

} // namespace OpenQuarn
