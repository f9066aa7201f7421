// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/playing.h"

#include "openquarn_app/Profiling.h"
#include "quarn/console/Console.h"
#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/interrupt.h"
#include "quarn/play/FrameFiles.h"
#include "quarn/play/GrowingCache.h"
#include "quarn/play/phaseTimes.h"
#include "quarn/play/playSetup.h"
#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/FramePlayer.h"
#include "quarn/scene/PartRecord.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/units.h"
#include "storage/CacheFormat.h"
#include "storage/WholeFile.h"
#include "storage/framePattern.h"

#include <algorithm>
#include <memory>
#include <stdexcept>

namespace quarn {
namespace {

// a recording ends with its owner, whatever happens
struct RecordingEnd {
    ~RecordingEnd() { OpenQuarn::Profiling::stop(); }
};

constexpr const char* prerollEntry = "preroll";
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

bool isNpy(const std::filesystem::path& output) {
    return !output.empty() && storage::cacheFormatOf(output) == storage::CacheFormat::npy;
}

// why no frame of an earlier run will do; empty: it will
std::string whyAll(const PlayPlan& plan) {
    if (!plan.against.isNull())
        return "all frames are compared";
    if (plan.repeats > 1)
        return "all frames are played several times";
    return plan.trace.empty() ? "" : "all frames are recorded";
}

void requireSense(const PlayPlan& plan) {
    if (!plan.part.of.empty() && !isNpy(plan.output))
        throw UsageError("--of goes with -o FILE.npy: no other file can be a part of a cache");
    if (!plan.leavesExisting)
        return;
    if (plan.output.empty() || !isFileOfEachFrame(plan.output, plan.frames))
        throw UsageError("--skip-existing goes with a file for each frame, as -o FILE.####.obj");
    if (const std::string why = whyAll(plan); !why.empty())
        throw UsageError("--skip-existing leaves frames out, and " + why);
}

class Playing {
public:
    Playing(SceneSession& session, PlayPlan plan, const Console& console)
        : console_(console)
        , plan_(std::move(plan))
        , part_(partFrames(plan_.frames, plan_.part))
        , models_({plan_.mesh, plan_.against})
        , guard_(guardOf(plan_))
        , player_(session, plan_.mesh, guard_ ? &*guard_ : nullptr)
        , poses_(AppliedModels({plan_.mesh}))
        , progress_(console, "playing", plan_.frames.count() * static_cast<std::size_t>(plan_.repeats)) {
        if (guard_)
            models_.setGuarded();
        if (!plan_.output.empty())
            checkFramePattern(plan_.output, plan_.frames);
        requireSense(plan_);
        if (!plan_.trace.empty())
            storage::WholeFile::requirePossible(plan_.trace);
    }

    PlayResult play() {
        Stage stage([&] { return std::string("playing ") + plan_.mesh.name().asChar(); });
        stage.result([&] {
            return std::to_string(plan_.frames.count()) + " frames, " + std::to_string(plan_.repeats) + " times";
        });
        playAndWrite();
        for (int repeat = 1; repeat < plan_.repeats; ++repeat) {
            record();
            for (std::size_t i = 0; i < plan_.frames.count(); ++i)
                playOne(plan_.frames.frame(i), true, false);
        }
        if (files_) {
            files_->finish();
            result_.shapes = files_->shapes();
            for (const std::string& note : files_->notes())
                console_.note(note);
        }
        if (cache_)
            publishCache();
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
    // the first time, which is not timed where there are several
    void playAndWrite() try {
        openCache();
        const FrameRange& frames = plan_.frames;
        const std::size_t kept = cache_ ? goOn() : 0;
        progress_.advance(result_.framesKept = kept);
        if (!plan_.leavesExisting) // and so outside of what is recorded
            evaluateBefore(frames.frame(kept));
        if (plan_.repeats == 1)
            record();
        for (std::size_t i = kept; i < frames.count(); ++i)
            if (isThere(frames.frame(i)))
                skipOne();
            else
                playNext(frames.frame(i));
        if (cache_)
            lookAhead();
    } catch (...) {
        if (cache_)
            cache_->keep();
        throw;
    }

    void record() {
        if (!plan_.trace.empty() && !OpenQuarn::Profiling::isRecording())
            OpenQuarn::Profiling::start();
    }

    double show(int frame) {
        const double seconds = models_.blame([&] { return player_.show(frame); });
        models_.requireSound();
        last_ = frame;
        return seconds;
    }

    void showUncounted(int frame) {
        throwIfInterrupted();
        show(frame);
        if (guard_)
            guard_->forget(frame);
    }

    // as many frames as are asked for, for what remembers them, without those that have just been shown
    void evaluateBefore(int frame) {
        for (const int earlier : part_.before(frame))
            if (!last_ || *last_ < earlier)
                showUncounted(earlier);
    }

    void playNext(int frame) {
        evaluateBefore(frame);
        playOne(frame, plan_.repeats == 1, true);
    }

    void playOne(int frame, bool isTimed, bool isLookedAt) {
        const double seconds = show(frame);
        if (isTimed)
            result_.times.add(frame, seconds);
        if (isLookedAt)
            lookAt(frame);
        progress_.advance();
    }

    bool isThere(int frame) const {
        std::error_code none;
        return plan_.leavesExisting && std::filesystem::is_regular_file(storage::frameFile(plan_.output, frame), none);
    }

    void skipOne() {
        ++result_.framesSkipped;
        progress_.advance();
    }

    void openCache() {
        if (!isNpy(plan_.output))
            return;
        setup_ = playSetup(plan_, part_);
        Setup asked = setup_;
        if (part_.preroll > 0)
            asked.add(prerollEntry, std::to_string(part_.preroll));
        cache_.emplace(plan_.output, asked, plan_.frames.count(), plan_.replacesBegun, console_);
    }

    // Answers how many frames of an earlier run stand. The last of them is evaluated once more: where what remembers
    // frames makes another one of it, those after it would not be what one run writes either.
    std::size_t goOn() {
        const std::size_t kept = cache_->goOn();
        if (kept == 0)
            return 0;
        std::string why = whyAll(plan_);
        if (why.empty() && !comesOut(kept - 1))
            why = "frame " + std::to_string(plan_.frames.frame(kept - 1)) +
                  " comes out otherwise than it did: something remembers the frames before it, as --preroll gives it";
        if (why.empty())
            return kept;
        cache_->beginAgain(why);
        last_.reset();
        return 0;
    }

    bool comesOut(std::size_t row) {
        const int frame = plan_.frames.frame(row);
        evaluateBefore(frame);
        showUncounted(frame);
        readPoints(frame);
        const std::span<const float> now = written();
        const std::vector<float> before = cache_->points(row);
        return std::ranges::equal(std::as_bytes(now), std::as_bytes(std::span(before)));
    }

    // of a part: what it makes of the frame that the next part begins with
    void lookAhead() {
        const std::optional<int> next = part_.next();
        if (!next)
            return;
        showUncounted(*next);
        readPoints(*next);
        nextSum_ = rowSum({std::as_bytes(written())});
    }

    void publishCache() {
        const std::string difference = playSetup(plan_, part_).differenceFrom(setup_);
        const std::string changed = "what is written has changed meanwhile (" + difference + ")";
        if (!difference.empty() && part_.isPart)
            throw std::runtime_error(changed + "; begin again with --overwrite");
        if (!difference.empty())
            console_.warn(changed);
        const std::filesystem::path record = PartRecord::besideCache(cache_->file());
        if (part_.isPart)
            storage::writeWhole(record, recordOf(cache_->setup().without(prerollEntry)).json());
        else
            std::filesystem::remove(record); // of a part that was there before
        cache_->publish();
    }

    PartRecord recordOf(const Setup& setup) const {
        PartRecord record = PartRecord::made(part_, setup);
        const std::vector<float> first = cache_->points(0);
        record.firstSum = rowSum({std::as_bytes(std::span(first))});
        record.nextSum = nextSum_;
        record.setup = setup.without(setupEntry::part);
        return record;
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
        readPoints(frame);
        if (!plan_.output.empty())
            write(frame);
        if (!plan_.against.isNull())
            compare(frame);
    }

    void readPoints(int frame) {
        player_.read(points_);
        requireFinite(points_, plan_.mesh, frame);
        const std::size_t count = points_.size() / 3;
        if (result_.vertexCount != 0 && result_.vertexCount != count)
            throw std::runtime_error("frame " + std::to_string(frame) + ": " + plan_.mesh.name().asChar() + " has " +
                                     std::to_string(count) + " vertices, and had " +
                                     std::to_string(result_.vertexCount) + " before");
        result_.vertexCount = count;
    }

    void write(int frame) {
        openFiles();
        files_->add(frame, points_);
    }

    std::span<const float> written() {
        openFiles();
        return files_->written(points_);
    }

    void openFiles() {
        if (files_)
            return;
        files_ = std::make_unique<FrameFiles>(
            plan_.output, polygonsOf(plan_.mesh),
            FrameWriting{plan_.order, plan_.space, plan_.frames, framesPerSecond().value_or(24.0), plan_.meshName,
                         metersPerUnit(), plan_.allowedError, plan_.source, cache_ ? &*cache_ : nullptr});
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
    PartFrames part_;
    AppliedModels models_;
    std::optional<EnvelopeGuard> guard_;
    FramePlayer player_;
    PoseWatch poses_;
    Progress progress_;
    RecordingEnd recordingEnd_;
    PlayResult result_;
    std::optional<int> last_; ///< frame that was shown
    Setup setup_;             ///< of a .npy
    std::optional<GrowingCache> cache_;
    std::optional<std::string> nextSum_;
    std::unique_ptr<FrameFiles> files_;
    std::vector<float> points_, target_, before_;
};

} // namespace

PlayResult playFrames(SceneSession& session, PlayPlan plan, const Console& console) {
    return Playing(session, std::move(plan), console).play();
}

} // namespace quarn
