// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/viewing.h"

#include "quarn/console/Console.h"
#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/numberText.h"
#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/FramePlayer.h"
#include "quarn/scene/PoseWatch.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/poseTexts.h"
#include "quarn/scene/units.h"
#include "quarn/view/NotInPage.h"
#include "quarn/view/PageFile.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double mmPerMeter = 1000.0;
constexpr double megabyte = 1e6;
// browsers hold a page as one text, and few people mail more
constexpr std::uint64_t largestPage = 256'000'000;

std::string sizeText(std::uint64_t bytes) {
    return roughText(static_cast<double>(bytes) / megabyte) + " MB";
}

// the part of the file that a block is in
std::string partOf(const std::string& block) {
    const std::map<std::string, std::string> parts = {{"network", "network"}, {"basis", "basis"},
                                                      {"target", "target"},   {"errors", "target"},
                                                      {"frames", "frames"},   {"texture", "textures"}};
    const auto part = parts.find(block.substr(0, block.find('.')));
    return part == parts.end() ? "mesh and rig" : part->second;
}

class Making {
public:
    Making(SceneSession& session, const ViewPlan& plan, const Console& console)
        : plan_(plan)
        , console_(console)
        , models_({plan.geometry.output, targetKind() == TargetKind::none ? HPlug() : plan.geometry.target})
        , player_(session, plan.geometry.output, nullptr)
        , poses_(AppliedModels({plan.geometry.output}))
        , source_{plan.warp, plan.geometry, targetKind() != TargetKind::none, 0, {}, {}} {
        facts_.title = plan.title;
        facts_.mesh = plan.geometry.name;
        facts_.scene = plan.scene;
        facts_.framesPerSecond = framesPerSecond().value_or(facts_.framesPerSecond);
        facts_.view = plan.view;
    }

    ViewResult make() {
        storage::WholeFile::requirePossible(plan_.output);
        requireModel();
        content_.mmPerUnit = mmPerMeter * metersPerUnit();
        play();
        measure();
        gatherPictures();
        prove();
        return write();
    }

private:
    TargetKind targetKind() const {
        const bool hasTarget = !plan_.geometry.target.isNull();
        const TargetKind kind = plan_.target.value_or(hasTarget ? TargetKind::points : TargetKind::none);
        if (kind != TargetKind::none && !hasTarget)
            throw std::runtime_error(plan_.geometry.name + " has no target: connect one into " + plan_.warp.name +
                                     ".targetGeometry[" + std::to_string(plan_.geometry.index) +
                                     "], or give --target none");
        return kind;
    }

    void requireModel() const {
        const std::string& name = plan_.warp.name;
        if (!isModelActive(plan_.warp, plan_.geometry))
            throw std::runtime_error("the model of " + name +
                                     " is off, and a page shows what a model does: switch it on, or give --model NAME");
        requireModelDirectory(plan_.warp, plan_.geometry);
        const std::string part = textOf(plan_.warp.plug("input", plan_.geometry, "componentTagExpression"));
        if (!part.empty() && part != "*")
            throw std::runtime_error(name + " deforms only the component " + part + " of " + plan_.geometry.name +
                                     "; a page shows deformers of whole meshes");
    }

    // --- from the scene ---

    void play() {
        Progress progress(console_, "playing", plan_.frames.count());
        for (std::size_t i = 0; i < plan_.frames.count(); ++i) {
            const int frame = plan_.frames.frame(i);
            models_.blame([&] { return player_.show(frame); });
            models_.requireSound();
            if (i == 0)
                takeFirst();
            readFrame(source_, frame, content_.frames);
            poses_.look(frame);
            progress.advance();
        }
        notePoses(console_, poses_.reports());
    }

    // what is known of the scene once a frame has been evaluated
    void takeFirst() {
        const Stage stage([] { return std::string("gathering the character"); });
        content_.polygons = polygonsOf(plan_.geometry.original);
        MeshPolygons shown = polygonsOf(plan_.geometry.output);
        if (shown.corners == content_.polygons.corners && shown.sizes == content_.polygons.sizes)
            content_.polygons = std::move(shown);
        readPoints(plan_.geometry.original, content_.rest);
        content_.frames.vertexCount = vertexCountOf(plan_.geometry.output);
        content_.model =
            readPageModel(modelDirectory(plan_.warp, plan_.geometry), content_.frames.vertexCount, plan_.basis);
        content_.weights = pointWeights(plan_.warp.node, plan_.geometry.index, content_.frames.vertexCount);
        source_.controlCount = content_.model.model->controlCount();
        takeChain();
        requireSize();
    }

    void takeChain() {
        const std::vector<SceneJoint> joints = sceneJoints();
        try {
            source_.chain = inputChain(plan_.geometry, joints);
            readPoints(source_.chain->base, content_.base);
            if (content_.base.size() != 3 * content_.frames.vertexCount)
                throw NotInPage(std::string(source_.chain->base.name().asChar()) + " has " +
                                std::to_string(content_.base.size() / 3) + " vertices");
        } catch (const NotInPage& why) {
            takePoints(why.what());
            return;
        }
        try {
            source_.rig = rigChain(plan_.warp, *source_.chain, joints, source_.controlCount);
        } catch (const Interrupted&) {
            throw;
        } catch (const std::runtime_error& why) {
            facts_.whyNoSliders = why.what();
        }
    }

    // the points of frames come in, as nothing on the page makes them
    void takePoints(const std::string& why) {
        facts_.whyPoints = why;
        facts_.whyNoSliders = "the mesh that comes into " + plan_.warp.name + " is not computed on the page: " + why;
        source_.chain.reset();
        source_.rig.reset();
    }

    // before all is played, from what takes most of the room
    void requireSize() const {
        const std::uint64_t coordinates = 3 * content_.frames.vertexCount * plan_.frames.count();
        std::uint64_t bytes = content_.model.basis.floats.size() * 2;
        std::string advice = "fewer frames (--frames " + std::to_string(plan_.frames.first) + "-" +
                             std::to_string(plan_.frames.last) + "x" + std::to_string(4 * plan_.frames.step) + ")";
        if (targetKind() == TargetKind::points) {
            bytes += 2 * coordinates;
            advice += " or --target errors or none";
        }
        if (!source_.chain)
            bytes += 4 * coordinates;
        requireAtMost(bytes / 3 * 4, advice);
    }
    void requireAtMost(std::uint64_t bytes, const std::string& advice) const {
        if (bytes > largestPage)
            throw std::runtime_error(plan_.output.string() + " would have " + sizeText(bytes) +
                                     ", and a page has at most " + sizeText(largestPage) + ": give " + advice);
    }

    // --- what is said of it ---

    void measure() {
        PageTarget& target = content_.target;
        target.kind = targetKind();
        facts_.diagonalMm = content_.mmPerUnit * boxDiagonal(content_.rest);
        facts_.basisErrorMm = content_.mmPerUnit * basisErrorOf(content_.model, content_.frames.controls);
        if (target.kind == TargetKind::none)
            return;
        const PageFrames& frames = content_.frames;
        target.skin = pageErrors(frames, frames.input, content_.mmPerUnit);
        target.neural = pageErrors(frames, frames.output, content_.mmPerUnit);
        if (target.kind == TargetKind::points) {
            target.points = packPoints(frames.target);
            return;
        }
        target.range = std::max(target.skin->largest, target.neural->largest);
        target.before = packDistances(distancesToTarget(frames, frames.input, content_.mmPerUnit), target.range);
        target.after = packDistances(distancesToTarget(frames, frames.output, content_.mmPerUnit), target.range);
    }

    void gatherPictures() {
        const HObject mesh = meshBehind(plan_.geometry.input);
        if (plan_.textureSize == 0 || mesh.isNull() || content_.polygons.uvs.empty())
            return;
        content_.textures = gatherTextures(mesh, content_.polygons, plan_.textureSize);
        for (const std::string& note : content_.textures.notes)
            console_.note(note);
    }

    // --- proof ---

    void prove() {
        const Stage stage([] { return std::string("comparing the page with the scene"); });
        facts_.limitMm = plan_.limitMm.value_or(std::max(0.01, 1e-5 * facts_.diagonalMm));
        PageProof proof = openAndCompare();
        if (source_.chain && proof.skin.distance > facts_.limitMm) {
            takePoints(differenceText(proof.skin, "what blend shapes and skin make there is", 0.0));
            proof = openAndCompare();
        }
        facts_.difference = proof.neural;
        if (proof.neural.distance > facts_.limitMm + facts_.basisErrorMm)
            throw std::runtime_error(
                differenceText(proof.neural, "the page is not what quarn play shows: it is", facts_.basisErrorMm));
        if (content_.rig)
            proveSliders();
        const std::size_t worst = content_.target.neural ? content_.target.neural->worstFrame : facts_.difference.frame;
        content_.checks = checksOf(*character_, worst);
    }

    void open() {
        content_.chain = source_.chain;
        content_.rig = source_.rig;
        character_.emplace(blocksOf(content_).opened());
    }
    PageProof openAndCompare() {
        open();
        Progress progress(console_, "comparing", content_.frames.count());
        return compareWithScene(*character_, ShownBy::frame, content_, [&] { progress.advance(); });
    }

    // with the values that its sliders have in a frame, the page shows that frame
    void proveSliders() {
        try {
            const PageProof proof = compareWithScene(*character_, ShownBy::sliders, content_);
            facts_.slidersMm = proof.neural.distance;
            if (proof.skin.distance > facts_.limitMm)
                throw NotInPage(differenceText(proof.skin, "the skin by the values of the sliders is", 0.0));
            if (proof.neural.distance > facts_.limitMm + facts_.basisErrorMm)
                throw NotInPage(
                    differenceText(proof.neural, "a pose by the values of the sliders is", facts_.basisErrorMm));
        } catch (const Interrupted&) {
            throw;
        } catch (const std::runtime_error& why) {
            facts_.whyNoSliders = why.what();
            source_.rig.reset();
            open();
        }
    }

    std::string differenceText(const Farthest& farthest, const std::string& begin, double ofBasis) const {
        const std::string packing = ofBasis > 0.0 ? " and " + roughText(ofBasis) + " mm for the packed basis" : "";
        return begin + " " + roughText(farthest.distance) + " mm off in frame " +
               std::to_string(content_.frames.numbers[farthest.frame]) + ", at vertex " +
               std::to_string(farthest.vertex) + ", where " + roughText(facts_.limitMm) + " mm" + packing +
               " are allowed";
    }

    // --- the file ---

    ViewResult write() {
        const PageBlocks blocks = blocksOf(content_);
        const std::string manifest = manifestOf(content_, facts_, blocks);
        ViewResult result;
        std::map<std::string, std::uint64_t> parts = {{"page", page_.bytes() + manifest.size()}};
        for (const PageBlock& block : blocks.all())
            parts[partOf(block.name)] += bytesInFile(block);
        for (const auto& [name, bytes] : parts)
            result.bytes += bytes;
        requireAtMost(result.bytes, "fewer frames, --basis i8, --target none or --no-textures");
        page_.write(plan_.output, manifest, blocks);
        result.bytes = std::filesystem::file_size(plan_.output);
        result.parts.assign(parts.begin(), parts.end());
        result.facts = facts_;
        result.vertices = content_.frames.vertexCount;
        result.frames = content_.frames.count();
        result.frameNumbers = content_.frames.numbers;
        result.sliders = content_.rig ? content_.rig->sliders.size() : 0;
        result.basis = plan_.basis;
        result.shapes = content_.model.shapes;
        if (content_.target.skin)
            result.errors.emplace(*content_.target.skin, *content_.target.neural);
        return result;
    }

    const PageTemplate page_; // found, or not, before anything is played
    const ViewPlan& plan_;
    const Console& console_;
    AppliedModels models_;
    FramePlayer player_;
    PoseWatch poses_;
    FrameSource source_;
    PageContent content_;
    PageFacts facts_;
    std::optional<viewer::Character> character_;
};

} // namespace

ViewResult makePage(SceneSession& session, const ViewPlan& plan, const Console& console) {
    return Making(session, plan, console).make();
}

} // namespace quarn
