// SPDX-License-Identifier: Apache-2.0
// Which model a deformed mesh is shown with, for one run: nothing here is saved.
#pragma once

#include "quarn/scene/Warp.h"

#include <string>

namespace CLI {
class App;
}

namespace quarn {

/// What the command line says.
struct ModelOption {
    std::string name;     ///< of --model; empty: not given
    bool hasNone = false; ///< --no-model
    bool isGiven() const { return hasNone || !name.empty(); }
};

/// Adds --model and --no-model to a sub-command. `option` must outlive it.
void addModelOptions(CLI::App& command, ModelOption& option);

/// What came of it.
struct ModelInUse {
    std::string name; ///< empty: none, or the mesh is none that a deformer gives out
    std::string from; ///< "option", "scene" or "only one that fits"
    std::string note; ///< a sentence for the user, where the mesh is another one than the scene or its user may think
};

/// Has the deformer apply the model `name` of its modelRoot to a geometry. Throws std::runtime_error when there is
/// no such model, and when the plugs cannot be set, as when something is connected into them. Thread: main.
void useModel(const Warp& warp, const WarpGeometry& geometry, const std::string& name);

/// Does what the option says to a geometry. Where it says nothing and the scene's model is Off: takes the only model
/// below modelRoot that fits the geometry, if there is exactly one, and says so; else says that this is the mesh as it
/// came in. A model fits whose directory has a network and metadata without a problem, for as many vertices. What
/// switches the model on is left alone where something is connected into it. Throws as useModel() does. Thread: main.
ModelInUse chooseModel(const Warp& warp, const WarpGeometry& geometry, const ModelOption& option);

/// The same for the geometry that gives out this very mesh plug; nothing for any other plug.
ModelInUse chooseModel(const HPlug& mesh, const ModelOption& option);

} // namespace quarn
