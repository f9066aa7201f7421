// SPDX-License-Identifier: Apache-2.0
#include "Deformation.h"

#include "checks.h"
#include "frame/blend.h"
#include "readBasis.h"
#include "viewer/Network.h"

#include <stdexcept>
#include <string>
#include <utility>

namespace viewer {
namespace {

neuralWarp::Points readRest(const Blocks& blocks, const Settings& settings) {
    const auto numbers = arrayOf<float>(blocks, "mesh.rest", product({3, settings.vertices}));
    neuralWarp::Points points(settings.vertices);
    for (std::size_t i = 0; i < points.size(); ++i)
        points[i] = {numbers[3 * i], numbers[3 * i + 1], numbers[3 * i + 2]};
    return points;
}

neuralWarp::SlotMap readSlots(const Blocks& blocks, const Settings& settings) {
    constexpr const char* name = "model.vertices";
    quill::IndexMapper trained, all;
    all.setIdentity(settings.vertices);
    if (blocks.has(name)) {
        const auto vertices = arrayOf<std::uint32_t>(blocks, name, settings.slots);
        checkBelow(name, vertices, settings.vertices, "vertices");
        trained.set({vertices.begin(), vertices.end()}, settings.vertices);
    } else if (settings.slots == settings.vertices) {
        trained.setIdentity(settings.vertices);
    } else {
        refuse("settings", std::to_string(settings.slots) + " slots for " + std::to_string(settings.vertices) +
                               " vertices need the block \"model.vertices\"");
    }
    return neuralWarp::mapSlots(trained, all);
}

std::unique_ptr<neuralWarp::Network> readNetwork(const Blocks& blocks, const Settings& settings) {
    auto network = std::make_unique<Network>(blocks.array<std::uint32_t>("network.words"),
                                             blocks.array<float>("network.constants"));
    if (network->inputCount() != settings.controls)
        refuse("network.words", "the network takes " + std::to_string(network->inputCount()) +
                                    " values, and there are " + std::to_string(settings.controls) + " controls");
    const std::uint64_t needed = settings.shapes != 0 ? settings.shapes : product({3, settings.slots});
    if (network->outputCount() < needed)
        refuse("network.words", "the network gives " + std::to_string(network->outputCount()) + " values, and " +
                                    std::to_string(needed) + " are needed");
    return network;
}

} // namespace

Deformation::Deformation(const Blocks& blocks, const Settings& settings, const quill::MeshTopology& topology)
    : settings_{.smoothingIterations = settings.smoothingIterations, .deltaMode = settings.deltaMode}
    , rest_(topology, readRest(blocks, settings), settings_)
    , slots_(readSlots(blocks, settings))
    , network_(readNetwork(blocks, settings)) {
    if (settings.shapes != 0)
        readBasis(blocks, settings, basis_);
    if (blocks.has("weights"))
        weights_ = heldArrayOf<float>(blocks, "weights", settings.vertices);
}

neuralWarp::FrameModel Deformation::frameModel() const {
    const std::size_t vertices = rest_.points.size();
    return {.settings = settings_,
            .vertexCount = vertices,
            .driven = slots_.isIdentity ? neuralWarp::DrivenVertices(vertices)
                                        : neuralWarp::DrivenVertices(slots_.vertices, slots_.slots),
            .slotCount = slots_.slotCount,
            .shapes = {basis_, basis_.shapeCount(), basis_.slotCount()},
            .rest = rest_.surface()};
}

void Deformation::run(neuralWarp::Points& result, const neuralWarp::Points& points, std::span<const float> controls,
                      float envelope) {
    const bool isDriven = slots_.isIdentity || !slots_.vertices.empty();
    result.resize(points.size());
    if (envelope == 0.0F || !isDriven) { // as the plug-in leaves a mesh alone
        result = points;
        return;
    }
    const neuralWarp::FrameModel model = frameModel();
    const neuralWarp::FrameSampler sampler(model);
    const neuralWarp::FrameCheck check = sampler.place(workspace_, workspace_.result, points, network_->run(controls));
    if (check.fault != neuralWarp::FrameFault::none)
        throw std::runtime_error("the model gives " + std::to_string(check.has) + " values where " +
                                 std::to_string(check.needed) + " are needed");
    neuralWarp::blendPositions(neuralWarp::MovedPointsOf<float>{&points.front().x, &result.front().x, points.size()},
                               weights_.values.empty() ? nullptr : weights_.values.data(),
                               {.driven = model.driven, .model = &workspace_.result, .envelope = envelope});
}

} // namespace viewer
