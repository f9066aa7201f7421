// SPDX-License-Identifier: Apache-2.0
#include "plugin/deformer/reference.h"

#include "libraries/geometry/reference.h"

#include <algorithm>
#include <cmath>
#include <utility>

namespace expected {
namespace {

using Vec = quill::val3<float>;

quill::IndexMapper mapOf(const Vertices& affected, std::size_t count) {
    quill::IndexMapper map;
    if (affected)
        map.set({affected->begin(), affected->end()}, count);
    else
        map.setIdentity(count);
    return map;
}

std::vector<std::vector<std::uint32_t>> hostPolygons(const ZooMesh& mesh) {
    std::vector<std::vector<std::uint32_t>> kept;
    std::copy_if(mesh.polygons.begin(), mesh.polygons.end(), std::back_inserter(kept),
                 [](const auto& polygon) { return polygon.size() > 2; });
    return kept;
}

/// Inverse distances, scaled so that they average 1.
std::vector<float> inverseDistances(const quill::VertexConnections& connections, const Points& points) {
    const auto& indexer = connections.connectionsIndexer();
    std::vector<float> weights(connections.connections().size());
    for (std::size_t i = 0; i < connections.vertexCount(); ++i) {
        double sum = 0.0;
        for (std::size_t k = indexer[i]; k < indexer[i + 1]; ++k) {
            const float distance = (points[i] - points[connections.connections()[k]]).length();
            const double weight = 1.0 / std::pow(static_cast<double>(std::max(distance, 0.001F)), 1.0);
            sum += weight;
            weights[k] = static_cast<float>(weight);
        }
        const auto scale = static_cast<float>(static_cast<double>(indexer[i + 1] - indexer[i]) / sum);
        for (std::size_t k = indexer[i]; k < indexer[i + 1]; ++k)
            weights[k] *= scale;
    }
    return weights;
}

} // namespace

Surface::Surface(const ZooMesh& mesh, const HPointArray& rest, const Vertices& affected)
    : map_(mapOf(affected, mesh.vertexCount()))
    , rest_(read(rest)) {
    const auto polygons = hostPolygons(mesh);
    connections_.build(makeTopology(polygons, mesh.vertexCount()), map_, 0, false);
    weights_ = inverseDistances(connections_, rest_);
    pairs_ = reference::cornerPairs(polygons, map_, &rest_);
}

Points Surface::read(const HPointArray& points) const {
    Points affected;
    affected.reserve(map_.affectCount());
    for (std::size_t k = 0; k < map_.affectCount(); ++k) {
        const HPoint& p = points[map_.toFull(k)];
        affected.emplace_back(static_cast<float>(p.x), static_cast<float>(p.y), static_cast<float>(p.z));
    }
    return affected;
}

Points Surface::smoothed(const Points& points, std::size_t iterations) const {
    return reference::smooth(points, connections_, {.iterations = iterations, .weights = &weights_});
}

Frames Surface::frames(const Points& points, bool inverted) const {
    Frames frames;
    frames.reserve(points.size());
    for (std::uint32_t i = 0; i < points.size(); ++i) {
        frames.push_back(reference::frame(i, pairs_[i], points));
        if (inverted)
            frames.back().gaussJordanInverse();
    }
    return frames;
}

Points trainingDeltas(const std::string& code, const Surface& surface, const HPointArray& input,
                      const HPointArray& target, std::size_t smoothing) {
    const Points i = surface.smoothed(surface.read(input), smoothing);
    const Points r = surface.smoothed(surface.rest(), smoothing);
    const Frames inputInverse = surface.frames(i, true);
    const Frames rest = surface.frames(r, false);
    Points deltas = surface.read(target);
    for (std::size_t j = 0; j < deltas.size(); ++j) {
        if (code == "dbp") {
            deltas[j] -= i[j];
        } else if (code == "dop") {
            deltas[j] -= r[j];
        } else {
            deltas[j] = quill::transformAsPoint(deltas[j], inputInverse[j]);
            if (code != "dbs")
                deltas[j] = quill::transformAsPoint(deltas[j], rest[j]);
            if (code == "dos")
                deltas[j] -= surface.rest()[j];
        }
    }
    return deltas;
}

std::vector<float> outputsOf(const ModelSpec& model, const std::vector<double>& controls) {
    std::vector<float> outputs = model.bias;
    for (std::size_t k = 0; k < model.weights.size(); ++k)
        if (model.weights[k] != 0.0F)
            outputs[k % outputs.size()] += static_cast<float>(controls.at(k / outputs.size()));
    return outputs;
}

Geometry::Geometry(ZooMesh mesh, Vertices affected)
    : mesh_(std::move(mesh))
    , affected_(std::move(affected)) {}

bool Geometry::drivesNothing() const {
    return slots_ && std::all_of(slots_->begin(), slots_->end(), [](auto slot) { return slot == quill::missingIndex; });
}

void Geometry::load(const ModelSpec& folder) {
    model_ = folder;
    const quill::IndexMapper& map = surface_->map();
    std::vector<std::uint32_t> covered; // full indices by slot
    if (folder.subsetState == "complete")
        for (std::uint32_t v = 0; v < folder.fullCount; ++v)
            covered.push_back(v);
    else if (folder.subsetState == "partial")
        covered = folder.affectMap;
    std::vector<std::uint32_t> deformed, slots;
    for (std::size_t k = 0; k < map.affectCount(); ++k) {
        deformed.push_back(map.toFull(k));
        const auto found = std::find(covered.begin(), covered.end(), deformed.back());
        slots.push_back(found == covered.end() ? quill::missingIndex
                                               : static_cast<std::uint32_t>(found - covered.begin()));
    }
    slots_.reset();
    if (covered != deformed)
        slots_ = slots;
}

Points Geometry::predicted(const Request& request) const {
    const std::vector<float> outputs = outputsOf(model_, request.controls);
    const bool isSurface = model_.deltaMode == 1;
    Points points = surface_->smoothed(surface_->read(request.input), model_.smoothingIterations);
    const Frames current = surface_->frames(points, false);
    const Frames rest = surface_->frames(surface_->smoothed(surface_->rest(), model_.smoothingIterations), true);
    for (std::size_t v = 0; v < points.size(); ++v) {
        const std::size_t m = slots_ ? (*slots_)[v] : v;
        if (m == quill::missingIndex)
            continue;
        Vec delta;
        if (model_.shapes.empty())
            delta = {outputs[3 * m], outputs[3 * m + 1], outputs[3 * m + 2]};
        for (std::size_t j = 0; j < model_.shapes.size(); ++j)
            for (std::size_t axis = 0; axis < 3; ++axis)
                delta[axis] += outputs[j] * model_.shapes[j][3 * m + axis];
        points[v] = isSurface ? quill::transformAsPoint(quill::transformAsPoint(surface_->rest()[v] + delta, rest[v]),
                                                        current[v])
                              : points[v] + delta;
    }
    return points;
}

HPointArray Geometry::evaluate(const Request& request, const ModelSpec& folder) {
    if (!surface_ || !std::equal(rest_.begin(), rest_.end(), request.rest.begin())) {
        rest_ = request.rest;
        surface_.emplace(mesh_, rest_, affected_);
        requestReload();
    }
    if (request.envelope == 0.0F)
        return request.input;
    bool isActive = request.modelOn && !request.exportMode;
    if (isActive && metadataIsDue_) {
        metadataIsDue_ = false;
        isActive = !drivesNothing(); // the model of before decides: the new one is loaded an evaluation later
    }
    const bool isMorphed = request.morphOn && request.morphEnvelope >= 1e-6 && !request.exportMode;
    isActive = isActive && !(isMorphed && request.morphEnvelope == 1.0);
    if (isActive && std::exchange(loadIsDue_, false))
        load(folder);
    HPointArray points = request.input;
    modelApplied_ = isActive && !drivesNothing();
    if (isActive || isMorphed)
        blend(points, request, isMorphed);
    return points;
}

void Geometry::blend(HPointArray& points, const Request& request, bool isMorphed) const {
    const Points own = surface_->read(request.input);
    const Points model = modelApplied_ ? predicted(request) : own;
    const Points target = isMorphed ? surface_->read(request.morphTarget) : own;
    const auto morph = static_cast<float>(request.morphEnvelope);
    for (std::size_t v = 0; v < own.size(); ++v) {
        const unsigned full = surface_->map().toFull(v);
        const bool isDriven = modelApplied_ && (!slots_ || (*slots_)[v] != quill::missingIndex);
        Vec current = isDriven ? model[v] : own[v];
        if (isMorphed)
            current += (target[v] - current) * morph;
        const double f = request.weights.empty() ? request.envelope : request.weights[full] * request.envelope;
        HPoint& p = points[full];
        p.x += (static_cast<double>(current.x) - p.x) * f;
        p.y += (static_cast<double>(current.y) - p.y) * f;
        p.z += (static_cast<double>(current.z) - p.z) * f;
    }
}

} // namespace expected
