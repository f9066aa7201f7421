// SPDX-License-Identifier: Apache-2.0
// From sliders to what the skin and the network get: joints, blend shapes and the chain of the controls, by the
// arithmetic of the rig nodes and of the control nodes.
#pragma once

#include "Settings.h"
#include "controls/matrixChannels.h"
#include "rig/combinedWeight.h"
#include "rig/jointMatrix.h"
#include "rig/linearBlend.h"
#include "viewer/Blocks.h"

#include "openquarn/HMatrix.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

namespace viewer {

/// What a frame is computed from.
struct RigPose {
    std::vector<rig::Affine> matrices; ///< [settings.matrices] bindPreMatrix * matrix
    std::vector<double> weights;       ///< [settings.blendShapes]
    std::vector<float> controls;       ///< [settings.controls]
};

/// A character of no sliders has none. One thread at a time.
class Rig {
public:
    /// Reads rig.*, skin.joints, skin.binds, frames.sliders and frames.animated. Throws std::runtime_error for blocks
    /// that do not fit.
    Rig(const Blocks& blocks, const Settings& settings);

    /// The pose of some slider values; what else is animated is as in `frame`.
    ///   frame    below settings.frames
    ///   sliders  [settings.sliders] finite
    void pose(std::size_t frame, std::span<const double> sliders, RigPose& made);

private:
    static constexpr std::size_t channelCount = 12;
    static constexpr std::uint32_t none = 0xFFFFFFFF;

    enum class ControlKind : std::uint32_t { constant, axes, converted, value, channel };
    enum class MatrixKind : std::uint32_t { relative, world, local };

    /// A joint's channel, or a free value.
    struct Place {
        std::uint32_t joint = none;
        std::uint32_t number = 0;
    };
    struct Joint {
        std::int32_t parent = -1;
        HEulerRotation::RotationOrder order = HEulerRotation::kXYZ;
        std::array<double, channelCount> channels{}; // of the pose
        HMatrix space;                               // of one without a parent
        HMatrix restInverse;
        HMatrix local, world; // of the pose
    };
    /// The numbers that a converter makes of one matrix.
    struct Conversion {
        std::uint32_t joint = 0;
        MatrixKind matrix = MatrixKind::relative;
        std::uint32_t converter = 0;
        std::vector<double> values; // of the pose
    };
    struct Control {
        ControlKind kind = ControlKind::constant;
        std::uint32_t source = 0; // joint, value or conversion
        std::uint32_t number = 0;
        MatrixKind matrix = MatrixKind::relative;
        float constant = 0.0F;
    };
    struct Combined {
        std::uint32_t shape = 0;
        std::vector<double> factors, ramps;
    };

    void readJoints(const Blocks& blocks, const Settings& settings);
    std::vector<Place> readPlaces(const Blocks& blocks, const char* name, std::size_t count) const;
    void readConverters(const Blocks& blocks, const Settings& settings);
    void readControls(const Blocks& blocks, const Settings& settings);
    Control readControl(std::span<const std::uint32_t> words, std::span<const double> constants);
    std::uint32_t conversionOf(std::uint32_t joint, MatrixKind matrix, std::uint32_t converter);
    void checkMatrix(std::uint32_t joint, std::uint32_t matrix) const;
    void readWeights(const Blocks& blocks, const Settings& settings);
    void readSkin(const Blocks& blocks, const Settings& settings);

    void reset();
    void set(std::span<const Place> places, std::span<const double> values);
    void placeJoints();
    HMatrix matrixOf(const Joint& joint, MatrixKind kind) const;
    void measureWeights(std::vector<double>& weights);
    void measureControls(std::vector<float>& controls);
    float valueOf(const Control& control) const;

    std::vector<Joint> joints_;
    std::vector<bool> hasRest_;
    HeldArray<double> channels_, values_; // of the first frame
    std::vector<double> freeValues_;      // of the pose
    std::vector<Place> sliders_, animated_;
    HeldArray<double> frames_; // [frames][animated]
    std::vector<neuralWarp::ChannelChoice> converters_;
    std::vector<Conversion> conversions_;
    std::vector<Control> controls_;
    std::vector<std::uint32_t> weightValues_; // of each blend shape
    std::vector<Combined> combined_;
    std::vector<rig::ShapeWeight> given_;
    std::vector<std::uint32_t> skinJoints_;
    std::vector<HMatrix> binds_;
};

} // namespace viewer
