// SPDX-License-Identifier: Apache-2.0
// A character of a page: a rigged mesh, the model that deforms it, and its motion. The same in a browser and natively,
// and from the matrices, weights and controls of frames on to the same bits; sines and cosines, by which sliders turn
// joints, may differ in the last bit.
#pragma once

#include "viewer/Blocks.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

namespace viewer {

enum class Shape : std::uint32_t {
    skin,   ///< as the rig makes it
    neural, ///< as the model deforms it
    target, ///< as it should be
};

/// Shows one pose after the other: a frame of the motion, or values of the sliders. After the first few it allocates
/// nothing that stays. What spans view holds until the next pose, is of the pose that is shown, and empty before the
/// first. One thread at a time. Everything that shows throws std::bad_alloc too.
class Character {
public:
    /// Opens the blocks of a page, which are not trusted: every size and index is checked here. Needs them no longer
    /// when it is done. Throws std::runtime_error, which names the block and the value.
    explicit Character(const Blocks& blocks);
    ~Character();
    Character(const Character&) = delete;
    Character& operator=(const Character&) = delete;

    std::size_t vertexCount() const;
    std::size_t drawVertexCount() const;
    std::size_t frameCount() const;
    std::size_t sliderCount() const;
    std::size_t controlCount() const;
    /// Whether frames have target points.
    bool hasTarget() const;
    /// Whether it is known how far frames are from their target.
    bool hasErrors() const;
    bool hasRig() const { return sliderCount() != 0; }

    /// Shows a frame of the motion, from 0. Throws std::runtime_error for one that is none.
    void showFrame(std::size_t frame);
    /// Shows a pose by its sliders; what else is animated is as in `frame`. Throws std::runtime_error for a frame that
    /// is none, a number of values that is not sliderCount(), and one that is not finite.
    void showSliders(std::size_t frame, std::span<const double> values);
    /// The user's share of what the model does, on top of the deformer's own envelope: of the poses from the next on.
    void setEnvelope(float factor);

    /// [3 * vertexCount()] object space; the target's is that of the frame, and empty without hasTarget().
    std::span<const float> points(Shape shape) const;
    /// [vertexCount()] distance to the target in mm: of the skin before, of the neural shape after the model. Empty for
    /// the target, without hasErrors(), and for a pose of sliders.
    std::span<const float> errors(Shape shape) const;
    /// [controlCount()] what the network got.
    std::span<const float> controls() const;
    /// FNV-1a with 64 bits over points(Shape::neural).
    std::uint64_t sum() const;

    /// How many frames have a stored sum of the points that the native build computes.
    std::size_t checkCount() const;
    /// Shows the frame of a check with the envelope of the user at 1, and compares. Throws std::runtime_error for a
    /// check that is none.
    bool check(std::size_t number);

    /// [3 * triangles] draw vertices; polygons in their order, each a fan about its first corner.
    std::span<const std::uint32_t> triangles() const;
    /// [3 * drawVertexCount()] computed when they are asked for.
    std::span<const float> drawPoints(Shape shape) const;
    std::span<const float> drawNormals(Shape shape) const;
    /// [drawVertexCount()] the same.
    std::span<const float> drawErrors(Shape shape) const;

private:
    struct Parts;
    std::unique_ptr<Parts> parts_;
};

} // namespace viewer
