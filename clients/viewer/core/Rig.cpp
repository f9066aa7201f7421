// SPDX-License-Identifier: Apache-2.0
#include "Rig.h"

#include "checks.h"
#include "controls/axes.h"

#include "openquarn/HString.h"

#include <algorithm>
#include <stdexcept>
#include <string>

namespace viewer {
namespace {

std::string text(std::size_t number) {
    return std::to_string(number);
}

HMatrix matrixAt(std::span<const double> numbers, std::size_t index) {
    HMatrix matrix;
    for (unsigned i = 0; i < 16; ++i)
        matrix[i / 4][i % 4] = numbers[16 * index + i];
    return matrix;
}

void checkIndex(const char* block, const char* what, std::uint32_t index, std::size_t end) {
    if (index >= end)
        refuse(block, std::string(what) + ' ' + text(index) + " is none of " + text(end));
}

neuralWarp::ChannelChoice choiceOf(std::uint32_t word, std::uint32_t conversion) {
    const auto bit = [word](unsigned place) { return (word >> place & 1U) != 0; };
    checkIndex("rig.converters", "rotation conversion", conversion, neuralWarp::ChannelChoice::kTripleAxis + 1);
    return {.rotation = bit(0),
            .scale = bit(1),
            .translation = bit(2),
            .rotationAxes = {bit(3), bit(4), bit(5)},
            .scaleAxes = {bit(6), bit(7), bit(8)},
            .translationAxes = {bit(9), bit(10), bit(11)},
            .conversion = static_cast<short>(conversion)};
}

void convert(const HMatrix& matrix, const neuralWarp::ChannelChoice& choice, std::vector<double>& values) {
    values.clear();
    if (const HStatus status = appendChannels(matrix, choice, values); status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

} // namespace

Rig::Rig(const Blocks& blocks, const Settings& settings) {
    if (!settings.hasRig())
        return;
    readJoints(blocks, settings);
    values_ = heldArrayOf<double>(blocks, "rig.values", settings.freeValues);
    checkFinite("rig.values", values_.values);
    freeValues_.resize(settings.freeValues);
    sliders_ = readPlaces(blocks, "rig.sliders", settings.sliders);
    if (blocks.has("rig.animated")) {
        animated_ = readPlaces(blocks, "rig.animated", blocks.array<std::uint32_t>("rig.animated").size() / 2);
        frames_ = heldArrayOf<double>(blocks, "frames.animated", product({settings.frames, animated_.size()}));
        checkFinite("frames.animated", frames_.values);
    }
    readConverters(blocks, settings);
    readControls(blocks, settings);
    readWeights(blocks, settings);
    readSkin(blocks, settings);
}

void Rig::readJoints(const Blocks& blocks, const Settings& settings) {
    const auto parents = arrayOf<std::int32_t>(blocks, "rig.parents", settings.joints);
    const auto orders = arrayOf<std::uint32_t>(blocks, "rig.orders", settings.joints);
    const auto rests = arrayOf<double>(blocks, "rig.rest", product({16, settings.joints}));
    const auto spaces = arrayOf<double>(blocks, "rig.space", product({16, settings.joints}));
    channels_ = heldArrayOf<double>(blocks, "rig.channels", product({channelCount, settings.joints}));
    checkFinite("rig.rest", rests);
    checkFinite("rig.space", spaces);
    checkFinite("rig.channels", channels_.values);
    checkBelow("rig.orders", orders, HEulerRotation::kZYX + 1, "rotation orders");
    joints_.resize(settings.joints);
    hasRest_.resize(settings.joints);
    for (std::size_t i = 0; i < joints_.size(); ++i) {
        if (parents[i] < -1 || parents[i] >= static_cast<std::int64_t>(i))
            refuse("rig.parents", "the parent of joint " + text(i) + " is " + std::to_string(parents[i]));
        HStatus status;
        joints_[i].parent = parents[i];
        joints_[i].order = static_cast<HEulerRotation::RotationOrder>(orders[i]);
        joints_[i].space = matrixAt(spaces, i);
        joints_[i].restInverse = matrixAt(rests, i).inverse(&status);
        hasRest_[i] = !status.error();
    }
}

std::vector<Rig::Place> Rig::readPlaces(const Blocks& blocks, const char* name, std::size_t count) const {
    const auto words = arrayOf<std::uint32_t>(blocks, name, product({2, count}));
    std::vector<Place> places;
    for (std::size_t i = 0; i < count; ++i) {
        const Place place{words[2 * i], words[2 * i + 1]};
        if (place.joint == none) {
            checkIndex(name, "free value", place.number, freeValues_.size());
        } else {
            checkIndex(name, "joint", place.joint, joints_.size());
            checkIndex(name, "channel", place.number, channelCount);
        }
        places.push_back(place);
    }
    return places;
}

void Rig::readConverters(const Blocks& blocks, const Settings& settings) {
    if (settings.converters == 0)
        return;
    const auto words = arrayOf<std::uint32_t>(blocks, "rig.converters", product({2, settings.converters}));
    for (std::size_t i = 0; i < settings.converters; ++i)
        converters_.push_back(choiceOf(words[2 * i], words[2 * i + 1]));
}

void Rig::readControls(const Blocks& blocks, const Settings& settings) {
    constexpr std::size_t width = 5;
    const auto words = arrayOf<std::uint32_t>(blocks, "rig.controls", product({width, settings.controls}));
    const auto constants =
        blocks.has("rig.constants") ? blocks.array<double>("rig.constants") : std::span<const double>();
    checkFinite("rig.constants", constants);
    for (std::size_t i = 0; i < settings.controls; ++i)
        controls_.push_back(readControl(words.subspan(width * i, width), constants));
}

Rig::Control Rig::readControl(std::span<const std::uint32_t> words, std::span<const double> constants) {
    constexpr const char* block = "rig.controls";
    checkIndex(block, "kind", words[0], static_cast<std::size_t>(ControlKind::channel) + 1);
    Control control{.kind = static_cast<ControlKind>(words[0]), .source = words[1], .number = words[2]};
    switch (control.kind) {
    case ControlKind::constant:
        checkIndex(block, "constant", control.source, constants.size());
        control.constant = static_cast<float>(constants[control.source]);
        break;
    case ControlKind::axes:
        checkMatrix(control.source, words[3]);
        checkIndex(block, "axis value", control.number, 6);
        control.matrix = static_cast<MatrixKind>(words[3]);
        break;
    case ControlKind::converted:
        checkMatrix(control.source, words[3]);
        checkIndex(block, "converter", words[4], converters_.size());
        control.source = conversionOf(control.source, static_cast<MatrixKind>(words[3]), words[4]);
        checkIndex(block, "converted value", control.number, conversions_[control.source].values.size());
        break;
    case ControlKind::value:
        checkIndex(block, "free value", control.source, freeValues_.size());
        break;
    case ControlKind::channel:
        checkIndex(block, "joint", control.source, joints_.size());
        checkIndex(block, "channel", control.number, channelCount);
        break;
    }
    return control;
}

void Rig::checkMatrix(std::uint32_t joint, std::uint32_t matrix) const {
    checkIndex("rig.controls", "joint", joint, joints_.size());
    checkIndex("rig.controls", "matrix", matrix, static_cast<std::size_t>(MatrixKind::local) + 1);
    if (static_cast<MatrixKind>(matrix) == MatrixKind::relative && !hasRest_[joint])
        refuse("rig.rest", "the matrix of joint " + text(joint) + " is singular");
}

/// The one of these three, which is made once for all controls that take a number of it.
std::uint32_t Rig::conversionOf(std::uint32_t joint, MatrixKind matrix, std::uint32_t converter) {
    const auto at = std::find_if(conversions_.rbegin(), conversions_.rend(), [&](const Conversion& conversion) {
        return conversion.joint == joint && conversion.matrix == matrix && conversion.converter == converter;
    });
    if (at != conversions_.rend())
        return static_cast<std::uint32_t>(conversions_.rend() - at - 1);
    Conversion& made = conversions_.emplace_back(Conversion{joint, matrix, converter, {}});
    convert(HMatrix(), converters_[converter], made.values);
    return static_cast<std::uint32_t>(conversions_.size() - 1);
}

void Rig::readWeights(const Blocks& blocks, const Settings& settings) {
    if (settings.blendShapes == 0)
        return;
    const auto values = arrayOf<std::uint32_t>(blocks, "rig.weights", settings.blendShapes);
    weightValues_.assign(values.begin(), values.end());
    const bool hasFactors = blocks.has("rig.factorCounts");
    const auto counts = hasFactors ? arrayOf<std::uint32_t>(blocks, "rig.factorCounts", settings.blendShapes)
                                   : std::span<const std::uint32_t>();
    const std::uint32_t sum = total("rig.factorCounts", counts);
    const auto factors =
        hasFactors ? arrayOf<std::uint32_t>(blocks, "rig.factors", sum) : std::span<const std::uint32_t>();
    const auto ramps = blocks.has("rig.ramps") ? blocks.array<double>("rig.ramps") : std::span<const double>();
    if (!ramps.empty())
        checkCount("rig.ramps", ramps.size(), product({3, sum}));
    std::size_t first = 0;
    for (std::uint32_t i = 0; i < settings.blendShapes; ++i) {
        const std::size_t count = hasFactors ? counts[i] : 0;
        if (values[i] != none) {
            checkIndex("rig.weights", "free value", values[i], freeValues_.size());
        } else if (count != 0) { // else there is no weight: it moves nothing
            const auto of = factors.subspan(first, count);
            const auto all = ramps.empty() ? ramps : ramps.subspan(3 * first, 3 * count);
            // a page has ramps for all or for none, and those of 0 stand for none
            const bool hasRamps = std::any_of(all.begin(), all.end(), [](double place) { return place != 0.0; });
            const auto through = all.first(hasRamps ? all.size() : 0);
            combined_.push_back({i, {of.begin(), of.end()}, {through.begin(), through.end()}});
        }
        first += count;
    }
    std::vector<double> weights(settings.blendShapes); // factors without a weight, and bad ramps, are found here
    measureWeights(weights);
}

void Rig::readSkin(const Blocks& blocks, const Settings& settings) {
    const auto joints = arrayOf<std::uint32_t>(blocks, "skin.joints", settings.matrices);
    const auto binds = arrayOf<double>(blocks, "skin.binds", product({16, settings.matrices}));
    for (std::size_t i = 0; i < joints.size(); ++i) {
        if (joints[i] != none)
            checkIndex("skin.joints", "joint", joints[i], joints_.size());
        binds_.push_back(matrixAt(binds, i));
    }
    skinJoints_.assign(joints.begin(), joints.end());
}

void Rig::pose(std::size_t frame, std::span<const double> sliders, RigPose& made) {
    reset();
    if (!animated_.empty())
        set(animated_, frames_.values.subspan(animated_.size() * frame, animated_.size()));
    set(sliders_, sliders);
    placeJoints();
    made.matrices.resize(binds_.size());
    for (std::size_t i = 0; i < binds_.size(); ++i)
        made.matrices[i] =
            rig::affineOf(skinJoints_[i] == none ? binds_[i] : binds_[i] * joints_[skinJoints_[i]].world);
    measureWeights(made.weights);
    measureControls(made.controls);
}

void Rig::reset() {
    for (std::size_t i = 0; i < joints_.size(); ++i)
        std::copy_n(channels_.values.data() + channelCount * i, channelCount, joints_[i].channels.data());
    std::copy(values_.values.begin(), values_.values.end(), freeValues_.begin());
}

void Rig::set(std::span<const Place> places, std::span<const double> values) {
    for (std::size_t i = 0; i < places.size(); ++i)
        if (places[i].joint == none)
            freeValues_[places[i].number] = values[i];
        else
            joints_[places[i].joint].channels[places[i].number] = values[i];
}

void Rig::placeJoints() {
    for (Joint& joint : joints_) {
        const std::array<double, channelCount>& c = joint.channels;
        joint.local = rig::jointMatrix({.translate = {c[0], c[1], c[2]},
                                        .rotate = {c[3], c[4], c[5]},
                                        .order = joint.order,
                                        .jointOrient = {c[6], c[7], c[8]},
                                        .scale = {c[9], c[10], c[11]}});
        joint.world =
            joint.local * (joint.parent < 0 ? joint.space : joints_[static_cast<std::size_t>(joint.parent)].world);
    }
}

HMatrix Rig::matrixOf(const Joint& joint, MatrixKind kind) const {
    switch (kind) {
    case MatrixKind::relative:
        return joint.local * joint.restInverse;
    case MatrixKind::world:
        return joint.world;
    case MatrixKind::local:
        break;
    }
    return joint.local;
}

void Rig::measureWeights(std::vector<double>& weights) {
    weights.resize(weightValues_.size());
    given_.clear();
    for (std::uint32_t i = 0; i < weights.size(); ++i)
        if (weightValues_[i] != none) {
            weights[i] = freeValues_[weightValues_[i]];
            given_.push_back({i, weights[i]});
        }
    for (const Combined& combined : combined_) {
        const HStatus status = rig::combineWeight({combined.factors, combined.ramps}, given_, weights[combined.shape]);
        if (status.error())
            refuse("rig.factors", "blend shape " + text(combined.shape) + ": " + status.errorString().asStdString());
    }
}

void Rig::measureControls(std::vector<float>& controls) {
    for (Conversion& conversion : conversions_)
        convert(matrixOf(joints_[conversion.joint], conversion.matrix), converters_[conversion.converter],
                conversion.values);
    controls.resize(controls_.size());
    for (std::size_t i = 0; i < controls.size(); ++i)
        controls[i] = valueOf(controls_[i]);
}

float Rig::valueOf(const Control& control) const {
    switch (control.kind) {
    case ControlKind::constant:
        break;
    case ControlKind::axes: {
        const HMatrix matrix = matrixOf(joints_[control.source], control.matrix);
        const neuralWarp::AxisPair axes = neuralWarp::orthonormalAxes(matrix.row(0), matrix.row(1));
        return static_cast<float>(control.number < 3 ? axes.x[control.number] : axes.y[control.number - 3]);
    }
    case ControlKind::converted:
        return static_cast<float>(conversions_[control.source].values[control.number]);
    case ControlKind::value:
        return static_cast<float>(freeValues_[control.source]);
    case ControlKind::channel:
        return static_cast<float>(joints_[control.source].channels[control.number]);
    }
    return control.constant;
}

} // namespace viewer
