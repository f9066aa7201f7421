// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Case.h"

#include "openquarn/HCommandResult.h"
#include "openquarn_app/Session.h"
#include "plugin/deformer/support/SeenOutputs.h"
#include "plugin/deformer/support/warpRig.h"

#include <string>
#include <vector>

namespace replay {

// The scene of a scenario: the plug-in, loaded from its library as users load it, and a node "neuralWarp1" with its
// geometries. Everything throws std::runtime_error when the host refuses something that should work.
class ScenarioScene {
public:
    // Reads "modelRoot" and "geometry".
    explicit ScenarioScene(Input& input);

    // Sets an attribute of the node. A list becomes the elements 0, 1, 2 ... of an array of numbers, and no others
    // stay.
    void set(const std::string& attribute, const Json& value);
    // Sets an element of an array attribute, or a child of that element. "input" moves the mesh that comes in; the
    // attributes of targets get a mesh node of these points.
    void setElement(const std::string& attribute, unsigned index, const Json& value);
    // Computes the geometry, also when nothing is dirty. The network's outputs are in modelOutputs() afterwards.
    HStatus deform(unsigned index);
    // Computes the geometry because its mesh arrives anew along the connection, and nothing else does: as in the next
    // frame of an animation. After deform() of that geometry.
    HStatus deformNextFrame(unsigned index) const;
    // How much of the target morph is asked for: 0 when it is off.
    double morphWeight() const;
    // Runs the command: these words, a flag for each of `indices` (none when null) and the name of the node.
    HStatus runCommand(const std::string& words, const Json* indices, HCommandResult& result) const;
    // Empties the scene and unloads the plug-in.
    void close();

    const warpRig::Rig& rig() const { return rig_; }
    const std::vector<float>& modelOutputs() const { return modelOutputs_.values; }
    // The text with "<ROOT>" in place of the model root.
    std::string withoutRoot(std::string text) const;

private:
    void addGeometry(unsigned index, Input geometry);
    void observeOutputs(unsigned index);
    HObject meshOf(unsigned index, const Json& points) const;

    std::string root_;
    SeenOutputs modelOutputs_;
    OpenQuarn::Session session_;
    std::string plugin_;
    warpRig::Rig rig_;
};

} // namespace replay
