// SPDX-License-Identifier: Apache-2.0
// What a page keeps of each frame, and how it is read from the scene.
#pragma once

#include "quarn/scene/Warp.h"
#include "quarn/view/InputChain.h"
#include "quarn/view/RigChain.h"

#include <optional>
#include <span>
#include <vector>

namespace quarn {

/// Frame after frame; points x, y, z of each vertex, in the scene's unit.
struct PageFrames {
    std::vector<int> numbers;                 ///< of the scene
    std::size_t vertexCount = 0;              ///< of the mesh
    std::vector<float> input, output, target; ///< [frames][vertices][3]; target: or empty
    std::vector<float> controls;              ///< [frames][controls of the network]
    std::vector<float> envelope;              ///< [frames]
    std::vector<float> matrices;              ///< [frames][influences][12]
    std::vector<double> weights;              ///< [frames][shapes]
    std::vector<double> sliders, animated;    ///< [frames][those of the rig]

    std::size_t count() const { return numbers.size(); }
    /// A frame of one of the arrays.
    template <class Number>
    std::span<const Number> of(const std::vector<Number>& array, std::size_t frame) const {
        const std::size_t size = array.size() / count();
        return {array.data() + frame * size, size};
    }
};

/// Where frames are read from; without a chain or a rig nothing of it.
struct FrameSource {
    const Warp& warp;
    const WarpGeometry& geometry;
    bool hasTarget = false;
    std::size_t controlCount = 0;
    std::optional<InputChain> chain;
    std::optional<RigChain> rig;
};

/// Adds the frame that the scene shows, which has been evaluated. Throws std::runtime_error, naming the frame and what
/// is wrong: a coordinate or control that is not finite, a mesh of another number of vertices, a model that is off or
/// replaced by a target morph. Thread: main.
void readFrame(const FrameSource& source, int frame, PageFrames& frames);

} // namespace quarn
