// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/FramePlayer.h"

#include "openquarn_app/Evaluation.h"
#include "quarn/scene/EnvelopeGuard.h"
#include "quarn/scene/FrameLog.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/meshes.h"
#include "storage/finite.h"

#include <chrono>
#include <optional>
#include <stdexcept>

namespace quarn {

FramePlayer::FramePlayer(SceneSession& session, HPlug mesh, EnvelopeGuard* guard)
    : session_(session)
    , mesh_(std::move(mesh))
    , guard_(guard) {}

double FramePlayer::show(int frame) {
    using Clock = std::chrono::steady_clock;
    errors_.clear();
    frame_ = frame;
    const FrameLog log(frame);
    const Clock::time_point begin = Clock::now();
    session_.host().setTime(frame);
    if (guard_ != nullptr)
        guard_->apply(frame);
    const HStatus status = OpenQuarn::evaluate(mesh_);
    const std::chrono::duration<double> seconds = Clock::now() - begin;
    requireNoErrors();
    if (status.error())
        throw std::runtime_error("frame " + std::to_string(frame) + ": " + mesh_.name().asChar() +
                                 " could not be evaluated: " + status.errorString().asChar());
    return seconds.count();
}

void FramePlayer::read(const HPlug& mesh, std::vector<float>& xyz) {
    errors_.clear();
    readPoints(mesh, xyz);
    requireNoErrors();
}

void FramePlayer::requireNoErrors() const {
    if (const std::string text = errors_.text(); !text.empty())
        throw std::runtime_error("frame " + std::to_string(frame_) + ": " + text);
}

void requireFinite(const std::vector<float>& xyz, const HPlug& mesh, int frame) {
    if (const std::optional<std::size_t> place = storage::firstNotFinite(xyz))
        throw std::runtime_error("frame " + std::to_string(frame) + ": vertex " + std::to_string(*place / 3) + " of " +
                                 mesh.name().asChar() + " has a coordinate that is no finite number");
}

} // namespace quarn
