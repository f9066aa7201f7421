// SPDX-License-Identifier: Apache-2.0
// Base class of the node types that deform geometry.
#pragma once

#include "openquarn/HIndexMapper.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HPxNode.h"

/// Deforms any number of geometries, each by itself: geometry i comes in at input[i].inputGeometry and leaves at
/// outputGeom[i], and a change of one does not make another dirty. The attributes below belong to the node class
/// "geometryFilter" (HNodeClass) and to every type registered as HPxNode::kGeometryFilterNode or kDeformerNode.
///
/// An element of outputGeom comes into being with input[i].inputGeometry, as soon as that is set or connected, and when
/// it is asked for.
class OPENQUARN_API HPxGeometryFilter : public HPxNode {
public:
    /// Array of the geometries, a compound of the two attributes after it.
    static const HObject input;
    /// Mesh: the geometry as it comes in.
    static const HObject inputGeometry;
    /// Text, default "*": which vertices are affected. The name of a component tag of inputGeometry, whose list also
    /// says in which order; "*" or nothing for all of them. An unknown tag is an error of that geometry.
    static const HObject componentTagExpression;
    /// Array of meshes: the rest shape of each geometry. The base only watches it, for initializeMultiIndex().
    static const HObject originalGeometry;
    /// Array of meshes, output: the deformed geometries.
    static const HObject outputGeom;
    /// Float, default 1, without limits: by how much deform() moves the points, where it says so. 0 is nothing; below
    /// 0 and above 1 it extrapolates. A change makes all geometries dirty.
    static const HObject envelope;

    HPxGeometryFilter();
    ~HPxGeometryFilter() override;

    /// Computes outputGeom: for each geometry that is asked for evaluates its input, calls the two functions below, and
    /// puts what they made of it into the output. When one of them fails, the output is the input geometry as it came,
    /// and the status is the answer. Answers kUnknownParameter for other plugs. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    /// Brings what the node keeps for one geometry into its first state: called before deform() in the first evaluation
    /// of the geometry, and again when what it was built from is no longer the same: another connection into
    /// inputGeometry or originalGeometry, other polygons or another number of vertices of either, another expression or
    /// another list of affected vertices, moved points of originalGeometry. Called again the next time after it
    /// failed, and not otherwise. Evaluations in another context start anew, with a first call of their own. The base
    /// does nothing.
    /// `multiIndex` logical index of the geometry. `reset` true when the host calls it. [eval]
    virtual HStatus initializeMultiIndex(HDataBlock& block, unsigned multiIndex, bool reset);

    /// Moves the points of one geometry. Several threads may be in it for one node, each for another geometry; nobody
    /// else evaluates the node's `multiIndex`. Points that are not set stay as they came in. The base does nothing.
    /// `iterator` on the affected vertices; not to be used after the call. `localToWorld` always the identity: meshes
    /// have no transformation. [eval]
    virtual HStatus deform(HDataBlock& block, HItGeometry& iterator, const HMatrix& localToWorld, unsigned multiIndex);

    /// Which vertices of a geometry are affected, after evaluating its input. The identity on no vertices when it has
    /// no mesh. Fails with kFailure when the component tag is unknown. [eval]
    HIndexMapper indexMapper(unsigned multiIndex, HStatus* status = nullptr) const;
};
