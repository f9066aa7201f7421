// SPDX-License-Identifier: Apache-2.0
// A scene, frame by frame.
#pragma once

#include "openquarn/HPlug.h"
#include "openquarn_app/Messages.h"

#include <string>
#include <vector>

namespace quarn {

class SceneSession;

/// While it lives, errors of the host and its plug-ins are kept instead of shown; warnings and the rest are shown as
/// ever. Thread: main; messages may come from any.
class HostErrors {
public:
    HostErrors();
    ~HostErrors();
    HostErrors(const HostErrors&) = delete;
    HostErrors& operator=(const HostErrors&) = delete;

    /// The first error since it was made or cleared, else the first failed call; empty when all went well.
    std::string text() const { return error_.empty() ? report_ : error_; }
    void clear();

private:
    OpenQuarn::MessageSink before_;
    std::string error_, report_;
};

/// Shows frames of a mesh plug. Errors are std::runtime_error with "frame N: " and what the host said. Thread: main.
class FramePlayer {
public:
    /// `mesh` must hold a mesh. `session` outlives it.
    FramePlayer(SceneSession& session, HPlug mesh);

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
    HostErrors errors_;
    int frame_ = 0;
};

/// Throws std::runtime_error, naming mesh, frame and vertex, where a coordinate is infinite or no number.
void requireFinite(const std::vector<float>& xyz, const HPlug& mesh, int frame);

} // namespace quarn
