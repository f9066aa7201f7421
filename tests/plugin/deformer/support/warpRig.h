// SPDX-License-Identifier: Apache-2.0
// A neuralWarp node with its geometries, built through the host's own interface.
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/HPlug.h"
#include "openquarn/HPointArray.h"
#include "support/meshZoo.h"

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

/// Everything throws std::runtime_error, with the host's sentence, when the host refuses something that should work.
namespace warpRig {

/// Registers the parts of the plug-in that are linked into this program, for the session that is open. (A program that
/// loads neuralWarp.so does not call it.)
void registerPlugin();

HObject mesh(const ZooMesh& mesh); ///< without polygons of fewer than three corners, which the host does not have
HObject withPoints(const HObject& mesh, const HPointArray& points);
HPointArray pointsOf(const HObject& mesh);
/// A mesh node that holds the mesh.
HObject meshNode(const std::string& name, const HObject& mesh);
void setMesh(const HObject& meshNode, const HObject& mesh);
void connect(const HPlug& source, const HPlug& destination);
void disconnect(const HPlug& source, const HPlug& destination);
/// "attribute[3].child" of a node.
HPlug plug(const HObject& node, std::string_view name);

/// One deformed geometry, as it is asked for.
struct GeometrySpec {
    HObject mesh;      ///< comes in
    HObject rest = {}; ///< null: the same
    /// Affected vertices in their order; none: all. They become the component tag "part" of both meshes.
    std::optional<std::vector<unsigned>> affected = {};
    std::vector<float> weights = {}; ///< by vertex of the whole geometry; empty: none
    std::string modelName = "model";
    bool modelOn = true;
    bool hasModelElement = true; ///< false: models[index] does not exist
};

class Rig {
public:
    explicit Rig(const std::string& nodeName = "warp1");

    /// Mesh nodes NODEinINDEX and NODErestINDEX, connected into the node.
    void addGeometry(unsigned index, const GeometrySpec& spec);
    void setModelRoot(const std::filesystem::path& root) const;
    void setControls(const std::vector<double>& values) const;
    /// Moves the input mesh; it may be another mesh altogether.
    void setInput(unsigned index, const HObject& mesh) const;
    void setRest(unsigned index, const HObject& mesh) const;
    /// Connects a mesh as target of the training deltas, and as target morph.
    void setTarget(unsigned index, const HObject& mesh) const;
    void setMorphTarget(unsigned index, const HObject& mesh) const;

    /// "attribute[3].child" of the node.
    HPlug plug(std::string_view name) const { return warpRig::plug(node, name); }
    HPlug output(unsigned index) const;
    /// Computes the geometry, also when nothing is dirty, and answers with the status of the node.
    HStatus deform(unsigned index) const;
    /// The points of the last evaluation.
    HPointArray result(unsigned index) const;
    /// Only the members are to be used where the plug-in was loaded as a library: its functions are its own. Null when
    /// the geometry has no state.
    neuralWarp::neuralWarpData* state(unsigned index) const;

    HObject node;

private:
    HObject named(const char* kind, unsigned index) const;
    HObject heldMesh(const char* kind, unsigned index, const HObject& mesh) const;
};

} // namespace warpRig
