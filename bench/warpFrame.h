// SPDX-License-Identifier: Apache-2.0
// A scene with a deformed grid, or many of the same model, whose frames are timed.
#pragma once

#include "openquarn_app/Session.h"
#include "plugin/deformer/support/warpRig.h"
#include "support/TemporaryFolder.h"

#include <cstddef>
#include <string>
#include <vector>

namespace bench {

struct WarpSetting {
    std::size_t side; // of the grid, in vertices
    bool isSurface;
    std::size_t shapes; // 0: a direct model
    unsigned smoothing;
    bool hasHidden = false; // two hidden layers of 512
};

std::string modelName(const WarpSetting& setting);

// Deformed grids, each with a deformer, whose model has been loaded. Throws std::runtime_error when a frame fails.
class WarpFrame {
public:
    // What is another in each frame, before the clock starts: a control value, which is set on the node itself, or the
    // points that come in along the connection.
    enum class Change { control, input };

    explicit WarpFrame(const WarpSetting& setting, Change change = Change::control, std::size_t characters = 1);

    // Seconds of one frame of one of them.
    double run(std::size_t character = 0);

    neuralWarp::neuralWarpData& state(std::size_t character = 0) { return *rigs_[character].state(0); }
    // The points that come in, those that came out last, and the control values of that frame.
    HPointArray input() const { return warpRig::pointsOf(input_); }
    HPointArray output() const { return rigs_[0].result(0); }
    std::vector<float> controls() const;
    std::size_t vertices() const { return vertices_; }

private:
    void addCharacter();
    void addShapes(std::size_t character);
    void change(std::size_t character);

    WarpSetting setting_;
    Change change_;
    std::size_t vertices_;
    OpenQuarn::Session session_;
    TemporaryFolder folder_;
    std::vector<warpRig::Rig> rigs_;
    HObject input_;
    std::vector<HObject> inputs_;
    std::vector<HPlug> outputs_, controls_;
    unsigned frame_ = 0;
};

// The value at a part q of the way through the sorted values, 0 for none.
double quantile(std::vector<double> values, double q);

} // namespace bench
