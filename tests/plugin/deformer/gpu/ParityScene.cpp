// SPDX-License-Identifier: Apache-2.0
#include "plugin/deformer/gpu/ParityScene.h"

#include "host/support/testNodes.h"
#include "openquarn_app/Evaluation.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <set>

namespace parity {
namespace {

constexpr std::size_t controls = 3;

std::string at(std::size_t i) {
    return "[" + std::to_string(i) + "]";
}

/// None of them near 0.
std::vector<float> strong(Dice& dice, std::size_t count, double limit) {
    std::vector<float> values = dice.floats(count, limit / 2);
    for (float& value : values)
        value += std::copysign(static_cast<float>(limit / 2), value);
    return values;
}

template <class Function>
void forCoordinates(const HPointArray& points, Function function) {
    for (const HPoint& p : points)
        for (const double x : {p.x, p.y, p.z})
            function(x);
}

} // namespace

Scene::Scene(const std::filesystem::path& folder, std::uint32_t seed, const Wish& wish, const std::string& name,
             const Scene* before)
    : rig(name)
    , folder_(folder)
    , name_(name)
    , wish_(wish)
    , before_(before) {
    Dice dice(seed);
    all_.reserve(wish.geometries.size());
    for (const GeometryWish& geometry : wish.geometries)
        add(geometry, dice);
    rig.setModelRoot(folder);
    connectControls();
    rig.plug("envelope").setFloat(static_cast<float>(wish.envelope));
    rig.plug("targetMorphEnabled").setBool(isMorphed());
    rig.plug("targetMorphEnvelope").setDouble(wish.morph.value_or(1.0));
    pose(seed + 1);
}

void Scene::connectControls() const {
    for (std::size_t i = 0; i < controls; ++i) {
        const std::string driver = name_ + "_control" + std::to_string(i);
        testNodes::create("testCase", driver);
        testNodes::connect(driver + ".out", name_ + ".controlValues" + at(i));
    }
}

void Scene::add(const GeometryWish& wish, Dice& dice) {
    const std::size_t number = all_.size();
    all_.push_back({wish, warpRig::mesh(wish.mesh)});
    Geometry& geometry = all_.back();
    geometry.base = warpRig::pointsOf(geometry.mesh);
    chooseVertices(geometry, dice);
    makeModel(geometry, dice);
    writeModel(modelDirectory(number), geometry.model);
    if (wish.isWeighted)
        geometry.weights = dice.floats(geometry.base.length(), 1.7);
    const HPointArray rest = dice.moved(geometry.base, 0.02 * diagonal(geometry.base));
    rig.addGeometry(index(number), {.mesh = geometry.mesh,
                                    .rest = warpRig::withPoints(geometry.mesh, rest),
                                    .affected = geometry.affected,
                                    .weights = geometry.weights,
                                    .modelName = modelName(number),
                                    .modelOn = wish.isModelOn});
    const HPlug in = rig.plug("input" + at(index(number)) + ".inputGeometry");
    geometry.mesh = in.asHObject(); // with its component tag
    rig.setMorphTarget(index(number), geometry.mesh);
    if (!before_)
        return;
    warpRig::disconnect(in.source(), in);
    warpRig::connect(before_->rig.output(index(number)), in);
}

void Scene::chooseVertices(Geometry& geometry, Dice& dice) const {
    const std::size_t full = geometry.base.length();
    if (geometry.wish.isPart)
        geometry.affected = dice.chosen(std::max<std::size_t>(1, full * 3 / 4), full);
    if (!geometry.wish.isOtherPart)
        return;
    const unsigned driven = geometry.affected ? geometry.affected->front() : 0;
    for (const unsigned vertex : dice.chosen(full, full))
        if (vertex == driven || !dice.oneIn(3))
            geometry.model.affectMap.push_back(vertex);
    geometry.model.subsetState = "partial";
}

void Scene::makeModel(Geometry& geometry, Dice& dice) const {
    ModelSpec& model = geometry.model;
    const double far = 0.15 * diagonal(geometry.base);
    const bool isPart = !model.affectMap.empty();
    model.fullCount = geometry.base.length();
    model.affectCount = geometry.affected ? static_cast<unsigned>(geometry.affected->size()) : model.fullCount;
    model.deltaMode = geometry.wish.deltaMode;
    model.smoothingIterations = geometry.wish.passes;
    // a model of all vertices has a slot for each, also where only some are deformed
    const std::size_t slots = isPart ? model.affectMap.size() : model.fullCount;
    for (std::size_t s = 0; s < geometry.wish.shapes; ++s)
        model.shapes.push_back(dice.floats(3 * slots, far));
    const bool isDirect = model.shapes.empty();
    const std::size_t outputs = isDirect ? 3 * slots : model.shapes.size();
    model.controls = controls;
    model.bias = strong(dice, outputs, isDirect ? far : 1.0);
    model.weights = dice.floats(controls * outputs, isDirect ? far : 1.0);
}

std::filesystem::path Scene::modelDirectory(std::size_t geometry) const {
    return folder_ / (modelName(geometry) + ".nwrp");
}

void Scene::pose(std::uint32_t seed) const {
    Dice dice(seed);
    for (std::size_t i = 0; i < controls; ++i)
        testNodes::plug(name_ + "_control" + std::to_string(i) + ".in").setDouble(dice.real(0.4));
    for (std::size_t g = 0; g < all_.size(); ++g) {
        const double size = diagonal(all_[g].base);
        const auto moved = [&](double by) {
            return warpRig::withPoints(all_[g].mesh, dice.moved(all_[g].base, by * size));
        };
        if (!before_)
            rig.setInput(index(g), moved(0.03));
        if (isMorphed())
            warpRig::setMesh(testNodes::plug(name_ + "morph" + std::to_string(index(g)) + ".inMesh").node(),
                             moved(0.2));
    }
}

HStatus Scene::evaluate(std::size_t geometry) const {
    return OpenQuarn::evaluate(rig.output(index(geometry)));
}

HStatus Scene::deform(std::size_t geometry) const {
    const HStatus status = before_ ? before_->deform(geometry) : HStatus();
    return status.error() ? status : rig.deform(index(geometry));
}

HPointArray Scene::input(std::size_t geometry) const {
    return warpRig::pointsOf(rig.plug("input" + at(index(geometry)) + ".inputGeometry").asHObject());
}

bool Scene::appliesModel(std::size_t geometry) const {
    const bool isHidden = isMorphed() && std::abs(*wish_.morph - 1.0) < 1e-6;
    return all_[geometry].wish.isModelOn && !isHidden;
}

bool Scene::isForTheCpu(std::size_t geometry) const {
    const neuralWarp::neuralWarpData& data = state(geometry);
    return data.activeSettings.isSurface() && data.vertexFrames.framesPairs().empty();
}

std::map<std::string, std::uint64_t> Scene::launches(std::size_t geometry) const {
    std::map<std::string, std::uint64_t> expected{{"copyToAffectBuffer", 1}, {"gpu_apply_deltas_kernel", 1}};
    const Geometry& of = all_[geometry];
    if (of.wish.isModelOn && of.wish.passes > 0)
        expected["averageVertKernel"] = of.wish.passes;
    if (appliesModel(geometry) && of.wish.shapes > 0)
        expected["gpu_principal_shapes_kernel"] = 1;
    return expected;
}

std::map<std::string, std::uint64_t> Scene::uploads(std::size_t geometry) const {
    std::map<std::string, std::uint64_t> expected;
    const std::uint64_t positions = (before_ ? 0U : 1U) + (isMorphed() ? 1U : 0U);
    if (positions > 0)
        expected["positions"] = positions;
    if (appliesModel(geometry))
        expected["values"] = 1;
    return expected;
}

std::uint64_t Scene::bytesUp(std::size_t geometry) const {
    const std::map<std::string, std::uint64_t> expected = uploads(geometry);
    const auto positions = expected.find("positions");
    return (positions == expected.end() ? 0 : positions->second * positionBytes(geometry)) +
           (appliesModel(geometry) ? all_[geometry].model.bias.size() * sizeof(float) : 0);
}

double Scene::size(std::size_t geometry, const HPointArray& result) const {
    double largest = 0.0;
    const auto consider = [&](double x) { largest = std::max(largest, std::abs(x)); };
    forCoordinates(all_[geometry].base, consider);
    forCoordinates(input(geometry), consider);
    forCoordinates(result, consider);
    double stretch = all_[geometry].weights.empty() ? 1.0 : 0.0;
    for (const float weight : all_[geometry].weights)
        stretch = std::max(stretch, static_cast<double>(std::abs(weight)));
    return largest * (1.0 + stretch * std::abs(wish_.envelope));
}

const Limits& Scene::limits(std::size_t geometry) const {
    if (!appliesModel(geometry))
        return isMorphed() && *wish_.morph != 1.0 && all_[geometry].wish.isModelOn ? hidden : offset;
    return all_[geometry].wish.deltaMode == 1 ? surface : offset;
}

double diagonal(const HPointArray& points) {
    HVector least(1e30, 1e30, 1e30), most(-1e30, -1e30, -1e30);
    for (const HPoint& p : points) {
        least = {std::min(least.x, p.x), std::min(least.y, p.y), std::min(least.z, p.z)};
        most = {std::max(most.x, p.x), std::max(most.y, p.y), std::max(most.z, p.z)};
    }
    const double length = (most - least).length();
    return points.length() == 0 || length == 0.0 ? 1.0 : length;
}

namespace {

template <class Function>
bool forDistances(const HPointArray& a, const HPointArray& b, Function function) {
    bool isRight = a.length() == b.length();
    for (unsigned i = 0; isRight && i < a.length(); ++i)
        for (const double d : {a[i].x - b[i].x, a[i].y - b[i].y, a[i].z - b[i].z}) {
            isRight = isRight && std::isfinite(d);
            function(std::abs(d));
        }
    return isRight;
}

} // namespace

double largestDistance(const HPointArray& a, const HPointArray& b) {
    double largest = 0.0;
    const bool isRight = forDistances(a, b, [&](double d) { largest = std::max(largest, d); });
    return isRight ? largest : std::numeric_limits<double>::infinity();
}

double meanDistance(const HPointArray& a, const HPointArray& b) {
    double sum = 0.0;
    const bool isRight = forDistances(a, b, [&](double d) { sum += d; });
    return isRight ? sum / std::max(1.0, 3.0 * a.length()) : std::numeric_limits<double>::infinity();
}

} // namespace parity
