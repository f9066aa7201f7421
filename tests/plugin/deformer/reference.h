// SPDX-License-Identifier: Apache-2.0
// What an evaluation and the training deltas must come to, by the most direct route: plain loops over the formulas, on
// nothing of the deformer's. Slow on purpose.
#pragma once

#include "openquarn/HPointArray.h"
#include "plugin/deformer/support/modelFolder.h"
#include "quill/IndexMapper.h"
#include "quill/VertexConnections.h"
#include "quill/mat4d.h"
#include "quill/val3.h"
#include "support/meshZoo.h"

#include <optional>
#include <string>
#include <vector>

namespace expected {

using Points = std::vector<quill::val3<float>>;
using Frames = std::vector<quill::mat4d>;
using Vertices = std::optional<std::vector<unsigned>>; ///< none: all of them

/// A rest pose and its deformed vertices, as smoothing and frames see them.
class Surface {
public:
    Surface(const ZooMesh& mesh, const HPointArray& rest, const Vertices& affected);

    const quill::IndexMapper& map() const { return map_; }
    const Points& rest() const { return rest_; }
    Points read(const HPointArray& points) const; ///< the affected ones, in single precision
    Points smoothed(const Points& points, std::size_t iterations) const;
    Frames frames(const Points& points, bool inverted) const;

private:
    quill::IndexMapper map_;
    Points rest_;
    quill::VertexConnections connections_;
    std::vector<float> weights_;
    std::vector<std::vector<std::uint32_t>> pairs_;
};

/// "dbs", "pos", "dos", "dbp", "dop".
Points trainingDeltas(const std::string& code, const Surface& surface, const HPointArray& input,
                      const HPointArray& target, std::size_t smoothing);

/// What one evaluation is asked for.
struct Request {
    HPointArray input, rest;
    std::vector<float> weights = {}; ///< by vertex of the whole geometry; empty: none
    float envelope = 1.0F;
    bool modelOn = true;
    bool exportMode = false;
    bool morphOn = false;
    double morphEnvelope = 1.0;
    HPointArray morphTarget = {};
    std::vector<double> controls = {};
};

/// One geometry, and what it keeps of its model from one evaluation to the next.
class Geometry {
public:
    Geometry(ZooMesh mesh, Vertices affected);

    void requestReload() { metadataIsDue_ = loadIsDue_ = true; }
    /// `folder` what the model directory holds. Another rest pose than that of before has everything made anew.
    HPointArray evaluate(const Request& request, const ModelSpec& folder);

    bool modelApplied() const { return modelApplied_; }
    bool usesAffectMap() const { return slots_.has_value(); }

private:
    void load(const ModelSpec& folder);
    bool drivesNothing() const;
    Points predicted(const Request& request) const;
    void blend(HPointArray& points, const Request& request, bool isMorphed) const;

    ZooMesh mesh_;
    Vertices affected_;
    HPointArray rest_;
    std::optional<Surface> surface_;
    bool metadataIsDue_ = true, loadIsDue_ = true, modelApplied_ = false;
    ModelSpec model_;                                 // as loaded
    std::optional<std::vector<std::uint32_t>> slots_; // by deformed vertex, while the vertices are not the model's
};

/// The outputs of the network of a model, when each depends on no more than one control with a weight of 1.
std::vector<float> outputsOf(const ModelSpec& model, const std::vector<double>& controls);

} // namespace expected
