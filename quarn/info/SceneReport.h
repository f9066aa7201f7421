// SPDX-License-Identifier: Apache-2.0
// An open scene: its character, its deformers, and what they need.
#pragma once

#include "quarn/console/json.h"
#include "quarn/info/ModelReport.h"

#include <string>
#include <vector>

namespace quarn {

struct Warp;
struct WarpGeometry;

struct DeformedGeometry {
    GeometryFacts facts;
    unsigned index = 0;
    std::string skinCache; ///< the file that stands in for its skin, as the scene names it; empty without one
    std::string modelName;
    std::string modelDirectory; ///< empty while the model has no name
    bool isModelActive = false;
    bool isModelThere = false; ///< its directory exists
};

struct DeformerReport {
    std::string name;
    int firstFrame = 0, lastFrame = 0; ///< the export range
    std::vector<DeformedGeometry> geometries;
};

struct SceneReport {
    std::string character; ///< the name of its node; empty without one
    std::string fileOrder; ///< of this: what the vertices of its file are, mesh by mesh; may be empty
    double metersPerUnit = 1.0;
    std::vector<DeformerReport> deformers;
    std::vector<std::string> missingFiles; ///< "NODE: PATH"
};

/// Of the scene that is open; relative paths count from the current directory. Throws std::runtime_error. Thread: main.
SceneReport describeScene();
/// Evaluates the geometry as it comes in. Thread: main.
GeometryFacts factsOf(const Warp& warp, const WarpGeometry& geometry);

std::string sceneText(const SceneReport& scene);
/// As members of the object that is open.
void writeScene(JsonWriter& json, const SceneReport& scene);

} // namespace quarn
