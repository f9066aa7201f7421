// SPDX-License-Identifier: Apache-2.0
#include "Skin.h"

#include "checks.h"

#include <algorithm>
#include <string>

namespace viewer {
namespace {

HPointArray readPoints(const Blocks& blocks, const Settings& settings) {
    const auto numbers = arrayOf<double>(blocks, "skin.points", product({3, settings.vertices}));
    HPointArray points(static_cast<unsigned>(settings.vertices));
    for (std::size_t i = 0; i < settings.vertices; ++i)
        points[i] = HPoint(numbers[3 * i], numbers[3 * i + 1], numbers[3 * i + 2]);
    return points;
}

rig::SkinWeights readSkin(const Blocks& blocks, const Settings& settings) {
    const auto counts = arrayOf<std::uint32_t>(blocks, "skin.counts", settings.vertices);
    const std::uint32_t sum = total("skin.counts", counts);
    const auto influences = arrayOf<std::uint32_t>(blocks, "skin.influences", sum);
    const auto weights = arrayOf<double>(blocks, "skin.weights", sum);
    checkBelow("skin.influences", influences, settings.matrices, "matrices");
    rig::SkinWeights skin;
    skin.first.reserve(counts.size() + 1);
    skin.first.push_back(0);
    for (const std::uint32_t count : counts)
        skin.first.push_back(skin.first.back() + count);
    skin.influences.reserve(influences.size());
    for (std::size_t i = 0; i < influences.size(); ++i)
        skin.influences.push_back({weights[i], influences[i]});
    return skin;
}

void checkAscending(std::span<const std::uint32_t> vertices) {
    const auto fault = std::adjacent_find(vertices.begin(), vertices.end(), std::greater_equal<>());
    if (fault != vertices.end())
        refuse("shapes.vertices", "vertex " + std::to_string(*(fault + 1)) + " comes after " + std::to_string(*fault));
}

std::vector<rig::ShapeDeltas> readShapes(const Blocks& blocks, const Settings& settings) {
    std::vector<rig::ShapeDeltas> shapes;
    if (settings.blendShapes == 0)
        return shapes;
    const auto counts = arrayOf<std::uint32_t>(blocks, "shapes.counts", settings.blendShapes);
    const std::uint32_t sum = total("shapes.counts", counts);
    const auto vertices = arrayOf<std::uint32_t>(blocks, "shapes.vertices", sum);
    const auto deltas = arrayOf<double>(blocks, "shapes.deltas", product({3, sum}));
    checkBelow("shapes.vertices", vertices, settings.vertices, "vertices");
    std::size_t first = 0;
    for (const std::uint32_t count : counts) {
        const auto ofShape = vertices.subspan(first, count);
        const auto xyz = deltas.subspan(3 * first, std::size_t{3} * count);
        checkAscending(ofShape);
        shapes.push_back({{ofShape.begin(), ofShape.end()}, {xyz.begin(), xyz.end()}});
        first += count;
    }
    return shapes;
}

} // namespace

Skin::Skin(const Blocks& blocks, const Settings& settings)
    : base_(readPoints(blocks, settings))
    , points_(base_)
    , skin_(readSkin(blocks, settings))
    , shapes_(readShapes(blocks, settings)) {
    active_.reserve(shapes_.size());
}

void Skin::pose(neuralWarp::Points& result, const std::vector<rig::Affine>& matrices, std::span<const double> weights) {
    std::copy(base_.begin(), base_.end(), points_.begin());
    active_.clear();
    for (std::size_t i = 0; i < shapes_.size(); ++i)
        if (weights[i] != 0.0)
            active_.push_back({&shapes_[i], weights[i]});
    if (!active_.empty()) // as the node: adding nothing would make 0 of -0
        rig::addShapes({active_, points_.length(), all_, nullptr, 1.0}, sums_, points_);
    rig::blendPoints({skin_, matrices, all_, nullptr, 1.0}, points_);
    result.resize(points_.length());
    for (std::size_t i = 0; i < result.size(); ++i)
        result[i] = {static_cast<float>(points_[i].x), static_cast<float>(points_[i].y),
                     static_cast<float>(points_[i].z)};
}

} // namespace viewer
