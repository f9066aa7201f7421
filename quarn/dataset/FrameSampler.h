// SPDX-License-Identifier: Apache-2.0
// The deformer in export mode, and what it gives frame by frame.
#pragma once

#include "quarn/dataset/DeltaKind.h"
#include "quarn/scene/ControlReader.h"
#include "quarn/scene/Warp.h"

#include "openquarn/HIndexMapper.h"

#include <string>
#include <vector>

namespace OpenQuarn {
class Session;
}

namespace quarn {

/// Steps a scene through frames and takes control values and training deltas of one geometry. The geometry is in export
/// mode as long as this lives. One frame is held. Errors are std::runtime_error with a sentence that begins with the
/// frame. Thread: main.
class FrameSampler {
public:
    /// Goes to the frame and samples it. Throws as sample() does, and for a geometry without a target, or without
    /// controls.
    FrameSampler(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry, int firstFrame);
    ~FrameSampler();
    FrameSampler(const FrameSampler&) = delete;
    FrameSampler& operator=(const FrameSampler&) = delete;

    const DeltaKind& kind() const { return kind_; }
    const HIndexMapper& map() const { return map_; }
    const std::vector<std::string>& names() const { return controls_.names(); }

    /// Afterwards controls(), deltas() and skin() are those of the frame; all of them are numbers.
    void sample(int frame);
    const std::vector<float>& controls() const { return controls_.values(); } ///< as many as names()
    const std::vector<float>& deltas() const { return deltas_; } ///< x, y, z of each affected vertex, in their order
    /// How far each of these vertices of the skin is from the target, in units of the scene.
    const std::vector<float>& skin() const { return skin_; }

private:
    void startExport();
    void endExport();
    void evaluateInputs();
    void readMap();
    void takeDeltas();
    void takeSkin();
    unsigned vertexOf(unsigned affected) const; ///< its index in the whole mesh
    void requirePlausible(unsigned affected) const;
    std::string targetSizes() const;
    std::string command(const std::string& flags) const;

    OpenQuarn::Session& host_;
    const Warp& warp_;
    const WarpGeometry& geometry_;
    DeltaKind kind_;
    double longestDelta_ = 0.0; ///< that is taken for one, in units of the scene
    HIndexMapper map_;
    ControlReader controls_;
    std::vector<float> deltas_, skin_;
    std::vector<double> skinPoints_, targetPoints_; ///< of the frame
};

} // namespace quarn
