// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/playing.h"

#include "openquarn_app/Profiling.h"
#include "quarn/console/Console.h"
#include "quarn/console/Log.h"
#include "quarn/play/FrameFiles.h"
#include "quarn/play/phaseTimes.h"
#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/FramePlayer.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/units.h"
#include "storage/WholeFile.h"

#include <memory>
#include <stdexcept>

namespace quarn {
namespace {

// a recording ends with its owner, whatever happens
struct RecordingEnd {
    ~RecordingEnd() { OpenQuarn::Profiling::stop(); }
};

constexpr std::uint64_t megabyte = 1'000'000;
constexpr std::uint64_t largestUnasked = 2'000 * megabyte;

// what the file is going to have; a large one has to be asked for
std::string sizeSentence(const std::filesystem::path& path, std::uint64_t bytes, bool isAnySizeWritten) {
    const std::string size = std::to_string((bytes + megabyte - 1) / megabyte) + " MB";
    if (bytes > largestUnasked && !isAnySizeWritten)
        throw std::runtime_error(path.string() + " would have about " + size +
                                 ": give --anyway, fewer frames, or a point cache (.pc2), which has 12 bytes a vertex "
                                 "and frame");
    return path.string() + " will have about " + size;
}

std::optional<EnvelopeGuard> guardOf(const PlayPlan& plan) {
    if (!plan.guardWidth)
        return {};
    return EnvelopeGuard(AppliedModels({plan.mesh}).geometries(), *plan.guardWidth);
}

class Playing {
public:
    Playing(SceneSession& session, PlayPlan plan, const Console& console)
        : console_(console)
        , plan_(std::move(plan))
        , models_({plan_.mesh, plan_.against})
        , guard_(guardOf(plan_))
        , player_(session, plan_.mesh, guard_ ? &*guard_ : nullptr)
        , poses_(AppliedModels({plan_.mesh}))
        , progress_(console, "playing", plan_.frames.count() * static_cast<std::size_t>(plan_.repeats)) {
        if (guard_)
            models_.setGuarded();
        if (!plan_.output.empty())
            checkFramePattern(plan_.output, plan_.frames);
        if (!plan_.trace.empty())
            storage::WholeFile::requirePossible(plan_.trace);
    }

    PlayResult play() {
        Stage stage([&] { return std::string("playing ") + plan_.mesh.name().asChar(); });
        stage.result([&] {
            return std::to_string(plan_.frames.count()) + " frames, " + std::to_string(plan_.repeats) + " times";
        });
        for (int repeat = 0; repeat < plan_.repeats; ++repeat) {
            const bool isTimed = repeat > 0 || plan_.repeats == 1;
            if (isTimed && !plan_.trace.empty() && !OpenQuarn::Profiling::isRecording())
                OpenQuarn::Profiling::start();
            for (std::size_t i = 0; i < plan_.frames.count(); ++i)
                playOne(plan_.frames.frame(i), isTimed, repeat == 0);
        }
        if (files_) {
            files_->finish();
            result_.shapes = files_->shapes();
            for (const std::string& note : files_->notes())
                console_.note(note);
        }
        if (!plan_.trace.empty())
            result_.phases = writeTraceAndReadPhases(plan_.trace);
        if (plan_.isOnGpu)
            takeGpuUse();
        if (guard_)
            result_.guard = guard_->reports();
        result_.poses = poses_.reports();
        return std::move(result_);
    }

private:
    void playOne(int frame, bool isTimed, bool isLookedAt) {
        const double seconds = models_.blame([&] { return player_.show(frame); });
        models_.requireSound();
        if (isTimed)
            result_.times.add(frame, seconds);
        if (isLookedAt)
            lookAt(frame);
        progress_.advance();
    }

    void takeGpuUse() {
        const GpuUse& use = result_.gpu.emplace(gpuUse());
        log([&] {
            return (use.device.empty() ? "no device" : "device " + use.device) + ": " + std::to_string(use.onGpu) +
                   " deformations there, " + std::to_string(use.onCpu) + " on the CPU, " +
                   std::to_string(use.fallbacks) + " of them after a failure";
        });
    }

    // once is enough: each repeat shows the same
    void lookAt(int frame) {
        poses_.look(frame);
        player_.read(points_);
        requireFinite(points_, plan_.mesh, frame);
        const std::size_t count = points_.size() / 3;
        if (result_.vertexCount != 0 && result_.vertexCount != count)
            throw std::runtime_error("frame " + std::to_string(frame) + ": " + plan_.mesh.name().asChar() + " has " +
                                     std::to_string(count) + " vertices, and had " +
                                     std::to_string(result_.vertexCount) + " before");
        result_.vertexCount = count;
        if (!plan_.output.empty())
            write(frame);
        if (!plan_.against.isNull())
            compare(frame);
    }

    void write(int frame) {
        if (!files_)
            openFiles();
        files_->add(frame, points_);
    }

    void openFiles() {
        files_ = std::make_unique<FrameFiles>(plan_.output, polygonsOf(plan_.mesh),
                                              FrameWriting{plan_.order, plan_.space, plan_.frames,
                                                           framesPerSecond().value_or(24.0), plan_.meshName,
                                                           metersPerUnit(), plan_.allowedError, plan_.source});
        if (const std::uint64_t bytes = files_->expectedBytes(); bytes != 0)
            console_.note(sizeSentence(plan_.output, bytes, plan_.isAnySizeWritten));
    }

    void compare(int frame) {
        readChecked(plan_.against, target_, frame);
        if (result_.boxDiagonal == 0.0)
            result_.boxDiagonal = boxDiagonal(plan_.rest ? *plan_.rest : target_);
        result_.targetJitter.add(target_);
        addTo(result_.mesh, frame, points_);
        if (plan_.before.isNull())
            return;
        readChecked(plan_.before, before_, frame);
        addTo(result_.before, frame, before_);
    }

    void readChecked(const HPlug& mesh, std::vector<float>& xyz, int frame) {
        player_.read(mesh, xyz);
        requireFinite(xyz, mesh, frame);
        if (xyz.size() != points_.size())
            throw std::runtime_error("frame " + std::to_string(frame) + ": " + mesh.name().asChar() + " has " +
                                     std::to_string(xyz.size() / 3) + " vertices, and " + plan_.mesh.name().asChar() +
                                     " has " + std::to_string(points_.size() / 3) + ": they cannot be compared");
    }

    void addTo(std::optional<Comparison>& comparison, int frame, const std::vector<float>& xyz) {
        if (!comparison)
            comparison.emplace();
        comparison->distances.add(frame, xyz, target_);
        comparison->jitter.add(xyz);
    }

    const Console& console_;
    PlayPlan plan_;
    AppliedModels models_;
    std::optional<EnvelopeGuard> guard_;
    FramePlayer player_;
    PoseWatch poses_;
    Progress progress_;
    RecordingEnd recordingEnd_;
    PlayResult result_;
    std::unique_ptr<FrameFiles> files_;
    std::vector<float> points_, target_, before_;
};

} // namespace

PlayResult playFrames(SceneSession& session, PlayPlan plan, const Console& console) {
    return Playing(session, std::move(plan), console).play();
}

} // namespace quarn
