// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "deformer/neuralWarpData.h"
#include "openquarn/HPointArray.h"

#include <vector>

// The fixed yardstick of a whole frame: what one writes first, in natural loops over oneTBB, each step into an array of
// its own that is allocated for it, in single precision where the deformer is. Not to be improved when the library is.
namespace plain {

class Frame {
public:
    // Takes what a deformer's state has measured at rest. The state must outlive this, which shares its network.
    //   input     [vertices] the points that come in
    //   isSurface, smoothing   as the model has it
    Frame(neuralWarp::neuralWarpData& state, const HPointArray& input, bool isSurface, unsigned smoothing);

    // From control values to the points that come out.
    void run(const std::vector<float>& controls);
    const std::vector<HPoint>& output() const { return output_; }

private:
    using Points = std::vector<quill::val3<float>>;
    Points deltasOf(const std::vector<float>& outputs) const;
    Points placed(const Points& smoothed, const Points& deltas) const;

    neuralWarp::neuralWarpData& state_;
    std::vector<HPoint> input_, output_;
    std::vector<float> basis_;
    std::size_t shapes_;
    bool isSurface_;
    unsigned smoothing_;
};

} // namespace plain
