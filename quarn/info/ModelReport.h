// SPDX-License-Identifier: Apache-2.0
// A model directory, looked at from outside: what it holds, and whether it fits a deformed geometry.
#pragma once

#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "quarn/scene/PoseWatch.h"
#include "quarn/scene/modelFiles.h"
#include "storage/npyArray.h"

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct ModelReport {
    std::filesystem::path directory;
    std::uint64_t bytes = 0; ///< of its five files
    neuralWarp::ModelMetadata metadata;
    std::size_t inputs = 0;  ///< control values that the network takes; 0 when it cannot be run
    std::size_t outputs = 0; ///< values that it gives; 0 when it cannot be run
    bool hasShapes = false;  ///< there is a file of principal shapes
    std::uint64_t shapeCount = 0;
    std::uint64_t shapeVertices = 0;
    std::string shapeSource;           ///< the file that the shapes' numbers are read from; empty for none
    std::vector<std::string> notes;    ///< one sentence each: what is odd, and keeps nothing from working
    std::vector<std::string> problems; ///< one sentence each: what keeps it from being used, in itself
    ModelKnowledge knowledge;
};

/// Slots of the model that a deformer reads: the vertices that it was trained on.
std::size_t trainedVertices(const neuralWarp::ModelMetadata& metadata);

/// Reads and runs the model once, with controls of 0. What is damaged is a problem in the report. The session is left
/// loaded when the network is sound. Libraries print on standard output meanwhile. Throws std::runtime_error only when
/// there is no such directory, or another one before it was read. Thread: main.
ModelReport readModel(const std::filesystem::path& directory, neuralWarp::ModelSession& session);

/// A report, what libraries had to say meanwhile, and what the network gave for rows of controls.
struct ModelAnswer {
    ModelReport model;
    std::string printed;
    std::vector<float> outputs; ///< model.outputs numbers for each row
};

/// readModel() in a process of its own, with limits of time and memory, and there the network with `rows` of controls,
/// of `columns` each. Throws std::runtime_error that names the directory when that process does not come back, or the
/// rows do not suit the network; Interrupted. Thread: main.
ModelAnswer readModelApart(const std::filesystem::path& directory, const storage::FloatTable& controls);

/// The deformed geometry that a model is held against.
struct GeometryFacts {
    std::string name;
    std::size_t vertices = 0;            ///< of the whole geometry
    std::vector<std::uint32_t> affected; ///< those that the deformer affects, in its order; all when it has no tag
    std::size_t controls = 0;            ///< elements of controlValues
    std::string restSum = {};            ///< meshSum() of its rest mesh; empty without one
};

/// How model and geometry fit.
struct Fit {
    std::vector<std::string> errors;   ///< the deformer refuses the model for each of them
    std::vector<std::string> warnings; ///< it uses the model, and somebody should know
    std::vector<PoseReport> poses;     ///< of frames of the scene, where they were looked at
};
Fit fitOf(const ModelReport& model, const GeometryFacts& geometry);

std::string modelText(const ModelReport& model, const std::optional<Fit>& fit);
std::string modelJson(const ModelReport& model, const std::optional<Fit>& fit);

} // namespace quarn
