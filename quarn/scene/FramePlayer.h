// SPDX-License-Identifier: Apache-2.0
// A scene, frame by frame.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/scene/HostErrors.h"

#include <string>
#include <vector>

namespace quarn {

class EnvelopeGuard;
class SceneSession;

/// Shows frames of a mesh plug. Errors are std::runtime_error with "frame N: " and what the host said. Thread: main.
class FramePlayer {
public:
    /// `mesh` must hold a mesh. `guard`: applied in every frame, as part of what is timed; may be null. Both outlive
    /// it, as `session` does.
    FramePlayer(SceneSession& session, HPlug mesh, EnvelopeGuard* guard);

    /// Sets the time and evaluates the mesh. Returns how long that took, in seconds. Throws also when the mesh could be
    /// evaluated and something before it, or its model, failed: the frame would not be what the scene describes.
    double show(int frame);
    /// Points of the mesh, or another one, in the frame that is shown.
    void read(const HPlug& mesh, std::vector<float>& xyz);
    void read(std::vector<float>& xyz) { read(mesh_, xyz); }

private:
    void requireNoErrors() const;

    SceneSession& session_;
    HPlug mesh_;
    EnvelopeGuard* guard_;
    HostErrors errors_;
    int frame_ = 0;
};

/// Throws std::runtime_error, naming mesh, frame and vertex, where a coordinate is infinite or no number.
void requireFinite(const std::vector<float>& xyz, const HPlug& mesh, int frame);

} // namespace quarn
