// SPDX-License-Identifier: Apache-2.0
#include "viewer/Character.h"

#include "Deformation.h"
#include "Drawing.h"
#include "Motion.h"
#include "Rig.h"
#include "Settings.h"
#include "Skin.h"
#include "Target.h"
#include "storage/Fnv64.h"

#include <array>
#include <cmath>
#include <optional>
#include <stdexcept>
#include <string>

namespace viewer {
namespace {

std::span<const float> numbersOf(const neuralWarp::Points& points) {
    return points.empty() ? std::span<const float>() : std::span<const float>(&points.front().x, 3 * points.size());
}

/// An array that is made when somebody asks for it.
struct Asked {
    std::vector<float> values;
    bool isCurrent = false;

    template <class Make>
    std::span<const float> get(const Make& make) {
        if (!isCurrent)
            make(values);
        isCurrent = true;
        return values;
    }
};

/// What is shown of one shape.
struct Shown {
    neuralWarp::Points points; // empty: there is none
    Asked errors, drawPoints, drawNormals, drawErrors;

    void renew() { errors.isCurrent = drawPoints.isCurrent = drawNormals.isCurrent = drawErrors.isCurrent = false; }
};

} // namespace

struct Character::Parts {
    Parts(const Blocks& blocks, const Settings& of, const quill::MeshTopology& topology)
        : settings(of)
        , motion(blocks, of)
        , rig(blocks, of)
        , deformation(blocks, of, topology)
        , target(blocks, of)
        , drawing(blocks, of, topology) {
        if (!of.takesPoints)
            skin.emplace(blocks, of);
    }

    Shown& of(Shape shape) { return shown[static_cast<std::size_t>(shape)]; }
    const neuralWarp::Points& pointsOf(Shape shape) { return of(shape).points; }
    bool isShape(Shape shape) const { return static_cast<std::size_t>(shape) < shown.size(); }

    void checkFrame(std::size_t number) const;
    void show(std::size_t number, std::span<const float> ofNetwork);
    std::span<const float> errors(Shape shape);

    Settings settings;
    Motion motion;
    std::optional<Skin> skin; // without one, points come from the motion
    Rig rig;
    Deformation deformation;
    Target target;
    Drawing drawing;

    float envelope = 1.0F;
    RigPose pose;
    std::array<Shown, 3> shown;
    std::size_t frame = 0;
    bool isOfSliders = false;
};

void Character::Parts::checkFrame(std::size_t number) const {
    if (number >= settings.frames)
        throw std::runtime_error("frame " + std::to_string(number) + " is none of " + std::to_string(settings.frames));
}

/// The shapes of a frame whose skin and controls are there.
void Character::Parts::show(std::size_t number, std::span<const float> ofNetwork) {
    frame = number;
    if (target.hasPoints())
        target.read(number, of(Shape::target).points);
    deformation.run(of(Shape::neural).points, pointsOf(Shape::skin), ofNetwork, motion.envelope(number) * envelope);
    for (Shown& shape : shown)
        shape.renew();
}

std::span<const float> Character::Parts::errors(Shape shape) {
    if (!isShape(shape) || shape == Shape::target || !target.hasErrors() || isOfSliders || pointsOf(shape).empty())
        return {};
    return of(shape).errors.get([&](std::vector<float>& distances) {
        if (target.hasPoints())
            target.measure(pointsOf(shape), pointsOf(Shape::target), distances);
        else
            target.readErrors(frame, shape == Shape::neural, distances);
    });
}

Character::Character(const Blocks& blocks) {
    const Settings settings = readSettings(blocks);
    parts_ = std::make_unique<Parts>(blocks, settings, readTopology(blocks, settings));
}

Character::~Character() = default;

std::size_t Character::vertexCount() const {
    return parts_->settings.vertices;
}

std::size_t Character::drawVertexCount() const {
    return parts_->drawing.vertexCount();
}

std::size_t Character::frameCount() const {
    return parts_->settings.frames;
}

std::size_t Character::sliderCount() const {
    return parts_->settings.sliders;
}

std::size_t Character::controlCount() const {
    return parts_->settings.controls;
}

bool Character::hasTarget() const {
    return parts_->target.hasPoints();
}

bool Character::hasErrors() const {
    return parts_->target.hasErrors();
}

void Character::showFrame(std::size_t frame) {
    Parts& parts = *parts_;
    parts.checkFrame(frame);
    if (parts.skin) {
        parts.motion.readMatrices(frame, parts.pose.matrices);
        parts.skin->pose(parts.of(Shape::skin).points, parts.pose.matrices, parts.motion.weights(frame));
    } else {
        parts.motion.readPoints(frame, parts.of(Shape::skin).points);
    }
    const std::span<const float> controls = parts.motion.controls(frame);
    parts.pose.controls.assign(controls.begin(), controls.end());
    parts.isOfSliders = false;
    parts.show(frame, parts.pose.controls);
}

void Character::showSliders(std::size_t frame, std::span<const double> values) {
    Parts& parts = *parts_;
    parts.checkFrame(frame);
    if (!hasRig() || values.size() != sliderCount())
        throw std::runtime_error(std::to_string(values.size()) + " values for " + std::to_string(sliderCount()) +
                                 " sliders");
    for (std::size_t i = 0; i < values.size(); ++i)
        if (!std::isfinite(values[i]))
            throw std::runtime_error("the value of slider " + std::to_string(i) + " is not finite");
    parts.rig.pose(frame, values, parts.pose);
    parts.skin->pose(parts.of(Shape::skin).points, parts.pose.matrices, parts.pose.weights);
    parts.isOfSliders = true;
    parts.show(frame, parts.pose.controls);
}

void Character::setEnvelope(float factor) {
    if (!std::isfinite(factor))
        throw std::runtime_error("the envelope is not finite");
    parts_->envelope = factor;
}

std::span<const float> Character::points(Shape shape) const {
    return parts_->isShape(shape) ? numbersOf(parts_->pointsOf(shape)) : std::span<const float>();
}

std::span<const float> Character::errors(Shape shape) const {
    return parts_->errors(shape);
}

std::span<const float> Character::controls() const {
    return parts_->pose.controls;
}

std::uint64_t Character::sum() const {
    storage::Fnv64 sum;
    sum.add(std::as_bytes(points(Shape::neural)));
    return sum.value();
}

std::size_t Character::checkCount() const {
    return parts_->motion.checkedFrames().size();
}

bool Character::check(std::size_t number) {
    if (number >= checkCount())
        throw std::runtime_error("check " + std::to_string(number) + " is none of " + std::to_string(checkCount()));
    const float envelope = parts_->envelope;
    parts_->envelope = 1.0F;
    showFrame(parts_->motion.checkedFrames()[number]);
    parts_->envelope = envelope;
    return sum() == parts_->motion.checkedSums()[number];
}

std::span<const std::uint32_t> Character::triangles() const {
    return parts_->drawing.triangles();
}

std::span<const float> Character::drawPoints(Shape shape) const {
    const std::span<const float> ofMesh = points(shape);
    if (ofMesh.empty() || parts_->drawing.isWhole())
        return ofMesh;
    return parts_->of(shape).drawPoints.get(
        [&](std::vector<float>& drawn) { parts_->drawing.spread(ofMesh, 3, drawn); });
}

std::span<const float> Character::drawNormals(Shape shape) const {
    const std::span<const float> ofMesh = points(shape);
    if (ofMesh.empty())
        return {};
    return parts_->of(shape).drawNormals.get(
        [&](std::vector<float>& normals) { parts_->drawing.measureNormals(ofMesh, normals); });
}

std::span<const float> Character::drawErrors(Shape shape) const {
    const std::span<const float> ofMesh = errors(shape);
    if (ofMesh.empty() || parts_->drawing.isWhole())
        return ofMesh;
    return parts_->of(shape).drawErrors.get(
        [&](std::vector<float>& drawn) { parts_->drawing.spread(ofMesh, 1, drawn); });
}

} // namespace viewer
