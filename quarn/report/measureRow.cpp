// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/measureRow.h"

#include "openquarn_app/Gpu.h"
#include "quarn/console/Console.h"
#include "quarn/console/StdoutAside.h"
#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/FramePlayer.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/evaluator.h"
#include "quarn/scene/joints.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/modelFiles.h"
#include "quarn/scene/skins.h"
#include "quarn/scene/units.h"
#include "quarn/scene/useModel.h"

#include <algorithm>
#include <numeric>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr double inMillimetres = 1000.0;
constexpr std::size_t mostPointsKept = std::size_t{1} << 27U; // floats: half a gigabyte

ModelInUse chooseModelOf(const Warp& warp, const WarpGeometry& geometry, const RowRequest& request) {
    ModelOption option;
    option.name = request.model;
    ModelInUse model = chooseModel(warp, geometry, option);
    if (model.name.empty())
        throw std::runtime_error(request.scene.string() + ": " + model.note + ", and there is nothing to report on");
    requireModelDirectory(warp, geometry);
    return model;
}

ModelFacts factsOf(const ModelInUse& model, const fs::path& directory) {
    ModelFacts facts;
    facts.name = model.name;
    facts.note = model.note;
    facts.isTheScenes = model.from == "scene";
    std::vector<std::string> problems; // a model that cannot be right is refused when it is applied
    neuralWarp::ModelMetadata metadata;
    readMetadata(directory, metadata, problems);
    const ShapeSizes shapes = readShapeSizes(directory, problems);
    facts.mode = metadata.deltaMode == 0 ? "offset" : "surface";
    facts.kind = shapes.hasFile ? "principal" : "direct";
    facts.smoothing = metadata.smoothingIterations;
    facts.shapes = shapes.count;
    if (const ModelKnowledge known = readKnowledge(directory); known.certificate) {
        facts.controls = known.certificate->controlNames.size();
        facts.poses = known.certificate->trainingFrames;
    }
    std::error_code error;
    for (fs::directory_iterator entry(directory, error), end; !error && entry != end; entry.increment(error))
        if (entry->is_regular_file(error))
            facts.files.emplace_back(entry->path().filename().string(), entry->file_size(error));
    std::sort(facts.files.begin(), facts.files.end());
    return facts;
}

// the joint with the largest weight at a vertex of the mesh, as the first skin of it that has as many vertices says
std::string jointAt(const std::string& mesh, std::size_t vertices, std::size_t vertex) {
    const std::vector<SceneJoint> joints = sceneJoints();
    for (const SceneSkin& skin : sceneSkins(joints)) {
        if (skin.mesh != mesh || skin.weights.vertexCount() != vertices)
            continue;
        const auto& influences = skin.weights.influences;
        const auto first = influences.begin() + static_cast<std::ptrdiff_t>(skin.weights.first[vertex]);
        const auto last = influences.begin() + static_cast<std::ptrdiff_t>(skin.weights.first[vertex + 1]);
        const auto most =
            std::max_element(first, last, [](const auto& a, const auto& b) { return a.weight < b.weight; });
        if (most == last)
            return {};
        const std::optional<std::size_t> joint = skin.influences[most->joint].joint;
        return joint ? joints[*joint].name : std::string();
    }
    return {};
}

/// Plays a scene as often as it is asked for.
class RowPlayer {
public:
    RowPlayer(SceneSession& session, const WarpGeometry& geometry, MeasuredRow& row, const Measuring& measuring,
              Progress& progress)
        : geometry_(geometry)
        , row_(row)
        , repeats_(measuring.repeats)
        , progress_(progress)
        , models_({geometry.output, geometry.target})
        , player_(session, geometry.output, nullptr)
        , poses_(AppliedModels({geometry.output})) {}

    void play() {
        repeat(row_.cpu, [&](int frame) { compare(frame); });
        row_.poses = poses_.reports();
    }

    // where there is a device, and a deformer for it
    void playOnGpu() {
        if (OpenQuarn::Gpu::devices().empty())
            return;
        try {
            chooseEvaluator("gpu", "");
        } catch (const std::runtime_error&) {
            return;
        }
        GpuRun run{"", 0, 0, {}, MeshErrors(inMillimetres * metersPerUnit())};
        std::size_t frames = 0;
        repeat(run.times, [&](int frame) {
            player_.read(points_);
            if (frames < kept_.size())
                run.difference.add(frame, points_, kept_[frames++]);
        });
        const GpuUse use = gpuUse();
        run.device = use.device;
        run.deformations = use.onGpu;
        run.fallbacks = use.fallbacks;
        row_.gpu = std::move(run);
    }

private:
    template <class LookAt>
    void repeat(FrameTimes& times, const LookAt& lookAt) {
        for (int repeat = 0; repeat < repeats_; ++repeat)
            for (std::size_t i = 0; i < row_.frames.count(); ++i) {
                const int frame = row_.frames.frame(i);
                const double seconds = models_.blame([&] { return player_.show(frame); });
                models_.requireSound();
                if (repeat > 0 || repeats_ == 1)
                    times.add(frame, seconds);
                if (repeat == 0)
                    lookAt(frame);
                progress_.advance();
            }
    }

    void compare(int frame) {
        poses_.look(frame);
        read(geometry_.output, points_, frame);
        read(geometry_.input, skin_, frame);
        read(geometry_.target, target_, frame);
        if (row_.diagonal == 0.0)
            row_.diagonal = diagonal() * inMillimetres * metersPerUnit();
        row_.vertices = points_.size() / 3;
        row_.before.add(frame, skin_, target_);
        row_.after.add(frame, points_, target_);
        targetJitter_.add(target_);
        row_.targetJitter = targetJitter_.largest() * inMillimetres * metersPerUnit();
        if ((kept_.size() + 1) * points_.size() <= mostPointsKept)
            kept_.push_back(points_);
    }

    double diagonal() const {
        if (geometry_.original.source().isNull())
            return boxDiagonal(target_);
        std::vector<float> rest;
        readPoints(geometry_.original, rest);
        return boxDiagonal(rest);
    }

    void read(const HPlug& mesh, std::vector<float>& xyz, int frame) {
        player_.read(mesh, xyz);
        requireFinite(xyz, mesh, frame);
        const std::size_t wanted = row_.vertices != 0 ? 3 * row_.vertices : points_.size();
        if (xyz.size() != wanted)
            throw std::runtime_error("frame " + std::to_string(frame) + ": " + mesh.name().asChar() + " has " +
                                     std::to_string(xyz.size() / 3) + " vertices, and " + std::to_string(wanted / 3) +
                                     " are compared with it");
    }

    const WarpGeometry& geometry_;
    MeasuredRow& row_;
    int repeats_;
    Progress& progress_;
    AppliedModels models_;
    FramePlayer player_;
    PoseWatch poses_;
    Jitter targetJitter_;
    std::vector<float> points_, skin_, target_;
    std::vector<std::vector<float>> kept_; ///< points of the CPU, of as many frames as there is room for
};

} // namespace

std::uint64_t ModelFacts::bytes() const {
    return std::accumulate(files.begin(), files.end(), std::uint64_t{0},
                           [](std::uint64_t sum, const auto& file) { return sum + file.second; });
}

MeasuredRow measureRow(const RowRequest& request, const Measuring& measuring, const Console& console) {
    const fs::path scene = absolutePath(request.scene);
    const StdoutAside aside;
    SceneSession session(SceneOptions{scene, measuring.plugins, measuring.threads});
    const Warp warp = Warp::find(request.deformer);
    const WarpGeometry& geometry = warp.geometry(request.geometry);
    if (geometry.target.isNull())
        throw std::runtime_error(request.scene.string() + ": " + geometry.name +
                                 " has no target, and a report is about the distance from it: connect one into " +
                                 warp.name + ".targetGeometry[" + std::to_string(geometry.index) +
                                 "], or let quarn target do it");
    chooseEvaluator("cpu", "");
    const ModelInUse model = chooseModelOf(warp, geometry, request);
    const double millimetres = inMillimetres * metersPerUnit();
    MeasuredRow row(millimetres);
    row.name = request.name;
    row.deformer = warp.name;
    row.mesh = geometry.name;
    row.scene = scene;
    row.skinPlug = geometry.input.name().asChar();
    row.targetPlug = geometry.target.name().asChar();
    row.meshPlug = geometry.output.name().asChar();
    row.frames = framesToPlay(request.frames, &warp);
    row.model = factsOf(model, modelDirectory(warp, geometry));
    Progress progress(console, "measuring " + request.name,
                      2 * row.frames.count() * static_cast<std::size_t>(measuring.repeats));
    RowPlayer player(session, geometry, row, measuring, progress);
    player.play();
    row.jointBefore = jointAt(row.mesh, row.vertices, row.before.worstVertex());
    row.jointAfter = jointAt(row.mesh, row.vertices, row.after.worstVertex());
    player.playOnGpu();
    return row;
}

} // namespace quarn
