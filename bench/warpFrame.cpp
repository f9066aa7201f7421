// SPDX-License-Identifier: Apache-2.0
#include "warpFrame.h"

#include "openquarn_app/Evaluation.h"
#include "plugin/deformer/support/modelFolder.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <stdexcept>

namespace bench {
namespace {

constexpr std::size_t controlCount = 16;

float noise(std::size_t i) {
    return 0.01F * std::sin(static_cast<float>(i % 10007));
}

ModelSpec modelOf(const WarpSetting& setting, std::size_t vertices) {
    ModelSpec spec;
    const std::size_t outputs = setting.shapes == 0 ? 3 * vertices : setting.shapes;
    spec.controls = controlCount;
    if (setting.hasHidden)
        spec.hidden = {512, 512};
    spec.bias.assign(outputs, 0.125F);
    spec.weights.resize((setting.hasHidden ? 512 : controlCount) * outputs);
    for (std::size_t i = 0; i < spec.weights.size(); ++i)
        spec.weights[i] = noise(i);
    constexpr std::size_t largestOnOneThread = 16U << 20U; // bytes; as the trainer has it
    if (spec.weights.size() * sizeof(float) < largestOnOneThread)
        spec.options = R"({"session_options": {"intra_op_num_threads": 1}})";
    spec.deltaMode = setting.isSurface ? 1 : 0;
    spec.smoothingIterations = setting.smoothing;
    spec.fullCount = spec.affectCount = static_cast<std::uint32_t>(vertices);
    return spec;
}

HObject lifted(const HObject& mesh) {
    HPointArray points = warpRig::pointsOf(mesh);
    for (HPoint& point : points)
        point.z += 0.01 * std::sin(point.x + point.y);
    return warpRig::withPoints(mesh, points);
}

} // namespace

std::string modelName(const WarpSetting& setting) {
    const std::string name = setting.shapes == 0 ? "direct" : "S=" + std::to_string(setting.shapes);
    return setting.hasHidden ? name + " 2x512" : name;
}

WarpFrame::WarpFrame(const WarpSetting& setting, Change change, std::size_t characters)
    : setting_(setting)
    , change_(change)
    , vertices_(setting.side * setting.side) {
    warpRig::registerPlugin();
    writeModel(folder_.path() / "model.nwrp", modelOf(setting, vertices_));
    const HObject mesh = warpRig::mesh(makeGrid(setting.side - 1, setting.side - 1));
    if (change == Change::input)
        inputs_ = {lifted(mesh), mesh};
    input_ = mesh;
    while (rigs_.size() < characters)
        addCharacter();
}

void WarpFrame::addCharacter() {
    const std::size_t character = rigs_.size();
    warpRig::Rig& rig = rigs_.emplace_back("warp" + std::to_string(character + 1));
    rig.addGeometry(0, {.mesh = input_});
    rig.setModelRoot(folder_.path());
    rig.setControls(std::vector<double>(controlCount, 0.25));
    outputs_.push_back(rig.output(0));
    controls_.push_back(rig.plug("controlValues[0]"));
    OpenQuarn::evaluate(outputs_.back()); // without shapes yet, when it needs some
    addShapes(character);
    run(character);
}

void WarpFrame::change(std::size_t character) {
    ++frame_;
    if (change_ == Change::control)
        controls_[character].setDouble(0.001 * static_cast<double>(frame_ % 1000));
    else
        rigs_[character].setInput(0, inputs_[frame_ % inputs_.size()]);
}

std::vector<float> WarpFrame::controls() const {
    std::vector<float> values(controlCount, 0.25F);
    values[0] = static_cast<float>(0.001 * static_cast<double>(frame_ % 1000));
    return values;
}

double WarpFrame::run(std::size_t character) {
    change(character);
    const auto start = std::chrono::steady_clock::now();
    const HStatus status = OpenQuarn::evaluate(outputs_[character]);
    const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    if (status.error() || !state(character).modelApplied)
        throw std::runtime_error("a frame failed: " + status.errorString().asStdString());
    return seconds;
}

// past the file: as text, a large basis takes longer to read than all frames together
void WarpFrame::addShapes(std::size_t character) {
    neuralWarp::neuralWarpData& data = state(character);
    data.principalShapeCount = setting_.shapes;
    data.principalVertCount = setting_.shapes == 0 ? 0 : vertices_;
    std::vector<float> values(3 * setting_.shapes * vertices_);
    for (std::size_t i = 0; i < values.size(); ++i)
        values[i] = noise(i);
    data.principalShapes.assign(values, setting_.shapes);
}

double quantile(std::vector<double> values, double q) {
    if (values.empty())
        return 0.0;
    std::sort(values.begin(), values.end());
    return values[static_cast<std::size_t>(std::lround(q * static_cast<double>(values.size() - 1)))];
}

} // namespace bench
