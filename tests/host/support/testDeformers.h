// SPDX-License-Identifier: Apache-2.0
// A deformer for tests, registered by a plug-in that lives in the test program, and meshes for it.
#pragma once

#include "openquarn/HFnMeshData.h"
#include "openquarn/HPxDeformerNode.h"

#include <functional>
#include <string>
#include <vector>

namespace testDeformers {

/// Registers "testDeformer" with the session that is open; unregisters it when that goes.
///   push  double, default 1, affects outputGeom
void registerTypes();

/// Moves each affected vertex by push * envelope * weight along x; touches nothing when the envelope is 0.
HStatus pushPoints(HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index);
/// The same, without an array of its own.
HStatus pushRawPoints(HPxDeformerNode& node, HDataBlock& block, HItGeometry& iterator, unsigned index);

struct Hooks {
    /// initializeMultiIndex() of every test deformer; nothing by default.
    static inline std::function<HStatus(HPxDeformerNode&, HDataBlock&, unsigned, bool)> initialize;
    /// deform() of every test deformer.
    static inline std::function<HStatus(HPxDeformerNode&, HDataBlock&, HItGeometry&, unsigned)> deform = pushPoints;
    static void reset() { initialize = nullptr, deform = pushPoints; }
};

/// `columns` x `rows` vertices one apart in the xy plane, row by row, in quads; z = `depth`.
HObject grid(unsigned columns, unsigned rows, double depth = 0.0);
/// The mesh with one more component tag.
HObject withTag(const HObject& mesh, const char* name, const HUintArray& vertices);
/// A mesh node that holds the mesh.
HObject meshNode(const std::string& name, const HObject& mesh);

/// The points of the mesh that a plug gives, evaluated; none when it gives no mesh.
std::vector<HPoint> points(const HPlug& plug);
/// How far each vertex has been moved along x from where it is in `from`.
std::vector<double> pushed(const HPlug& plug, const HObject& from);

} // namespace testDeformers
