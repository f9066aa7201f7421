// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/FrameSampler.h"

#include "quarn/dataset/strictly.h"
#include "quarn/scene/FrameLog.h"
#include "quarn/scene/HostErrors.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Session.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

[[noreturn]] void fail(const std::string& why) {
    throw std::runtime_error(why);
}

void evaluate(const HPlug& plug) {
    if (const HStatus status = OpenQuarn::evaluate(plug); status.error())
        fail(std::string(plug.name().asChar()) + " could not be evaluated: " + status.errorString().asChar());
}

std::string elementName(const Warp& warp, const char* array, const WarpGeometry& geometry) {
    return warp.name + "." + array + "[" + std::to_string(geometry.index) + "]";
}

DeltaKind deltaKind(const Warp& warp, const WarpGeometry& geometry) {
    const HPlug mode = warp.plug("export", geometry, "deltaMode");
    DeltaKind kind;
    kind.mode = wholeNumberOf(mode);
    kind.smoothingIterations = wholeNumberOf(warp.plug("export", geometry, "smoothingIterations"));
    if (kind.mode != 0 && kind.mode != 1)
        fail(std::string(mode.name().asChar()) + " is " + std::to_string(kind.mode) + "; set it to Offset or Surface");
    return kind;
}

// the deformer needs the elements to be there, also where everything in them is as it is by default
void makeElement(const Warp& warp, const WarpGeometry& geometry, const char* array, const char* child) {
    const std::vector<unsigned> indices = indicesOf(warp.plug(array));
    const HPlug plug = warp.plug(array, geometry, child);
    if (std::find(indices.begin(), indices.end(), geometry.index) == indices.end())
        setNumber(plug, numberOf(plug));
}

} // namespace

FrameSampler::FrameSampler(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry, int firstFrame)
    : host_(host)
    , warp_(warp)
    , geometry_(geometry)
    , controls_(warp) {
    if (geometry.target.isNull())
        fail(elementName(warp, "targetGeometry", geometry) +
             " has no target; quarn target SCENE --cache FILE.npy connects one");
    kind_ = deltaKind(warp, geometry);
    longestDelta_ = 10.0 * diagonalOf(geometry.original);
    makeElement(warp, geometry, "export", "deltaMode");
    makeElement(warp, geometry, "models", "modelActive");
    host.setTime(firstFrame);
    strictly(firstFrame, [&] { evaluateInputs(); });
    {
        const HostErrors ofTheModel; // it may not have been trained, and has no part in this
        OpenQuarn::evaluate(geometry.output);
    }
    strictly(firstFrame, [&] {
        controls_.readNames();
        readMap();
        startExport();
    });
    try {
        sample(firstFrame);
    } catch (...) {
        endExport(); // there is no destructor after this
        throw;
    }
}

FrameSampler::~FrameSampler() {
    endExport();
}

std::string FrameSampler::command(const std::string& flags) const {
    return "neuralWarp -multiIndex " + std::to_string(geometry_.index) + " " + flags + " " +
           OpenQuarn::quotedWord(warp_.name);
}

void FrameSampler::startExport() {
    if (const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(command("-exportActive on")); !outcome)
        fail(outcome.error);
    OpenQuarn::makeDirty(warp_.node);
}

void FrameSampler::endExport() {
    OpenQuarn::runCommand(command("-exportActive off"));
    OpenQuarn::makeDirty(warp_.node);
}

void FrameSampler::evaluateInputs() {
    evaluate(geometry_.input);
    evaluate(geometry_.target);
    if (geometry_.target.asHObject().isNull())
        fail("the target " + std::string(geometry_.target.name().asChar()) + " holds no mesh");
    controls_.read();
}

void FrameSampler::readMap() {
    HStatus status;
    const auto* deformer = dynamic_cast<HPxDeformerNode*>(HFnDependencyNode(warp_.node).userNode());
    if (deformer == nullptr)
        fail(warp_.name + " is no deformer of this plug-in");
    map_ = deformer->indexMapper(geometry_.index, &status);
    if (status.error())
        fail(elementName(warp_, "input", geometry_) + ": " + status.errorString().asChar());
}

void FrameSampler::sample(int frame) {
    const FrameLog log(frame);
    host_.setTime(frame);
    strictly(frame, [&] {
        evaluateInputs();
        evaluate(geometry_.output);
        takeDeltas();
        takeSkin();
    });
}

void FrameSampler::takeDeltas() {
    const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(command("-vertexDeltas " + kind_.code()));
    if (!outcome)
        fail(outcome.error);
    const auto* given = std::get_if<std::vector<double>>(&outcome.result);
    const std::size_t count = given == nullptr ? 0 : given->size();
    if (count != 3 * std::size_t{map_.affectCount()})
        fail(targetSizes() + ", and " + std::to_string(count / 3) + " deltas were given for " +
             std::to_string(map_.affectCount()) + " deformed vertices");
    deltas_.resize(count);
    std::transform(given->begin(), given->end(), deltas_.begin(), [](double x) { return static_cast<float>(x); });
    for (unsigned affected = 0; affected < map_.affectCount(); ++affected)
        requirePlausible(affected);
}

void FrameSampler::takeSkin() {
    readPoints(geometry_.input, skinPoints_);
    readPoints(geometry_.target, targetPoints_);
    skin_.resize(map_.affectCount());
    for (unsigned affected = 0; affected < map_.affectCount(); ++affected) {
        const std::size_t first = 3 * std::size_t{vertexOf(affected)};
        const auto apart = [&](std::size_t axis) {
            return skinPoints_.at(first + axis) - targetPoints_.at(first + axis);
        };
        skin_[affected] = static_cast<float>(std::hypot(apart(0), apart(1), apart(2)));
    }
}

unsigned FrameSampler::vertexOf(unsigned affected) const {
    return map_.isIdentityMap() ? affected : map_.affectMap()[affected];
}

// a frame of the deformer that has collapsed gives deltas of any size, and one of them spoils a whole training
void FrameSampler::requirePlausible(unsigned affected) const {
    const float* delta = &deltas_[3 * std::size_t{affected}];
    const double length = std::hypot(double{delta[0]}, double{delta[1]}, double{delta[2]});
    if (length <= longestDelta_)
        return;
    const std::string which = "the delta of vertex " + std::to_string(vertexOf(affected)) + " of " + geometry_.name;
    if (!std::isfinite(length))
        fail(which + " is no finite number");
    std::string advice = "; is the target where the mesh is?";
    if (kind_.mode == 1)
        advice = ". Where smoothing folds the surface its frames collapse: lower " +
                 elementName(warp_, "export", geometry_) + ".smoothingIterations (" +
                 std::to_string(kind_.smoothingIterations) + "), or take Offset deltas";
    fail(which + " is " + std::to_string(length) + " long, more than ten times the mesh" + advice);
}

std::string FrameSampler::targetSizes() const {
    std::vector<float> points;
    readPoints(geometry_.target, points);
    const std::size_t target = points.size() / 3;
    readPoints(geometry_.input, points);
    return "the target " + std::string(geometry_.target.name().asChar()) + " has " + std::to_string(target) +
           " vertices, and " + geometry_.name + " has " + std::to_string(points.size() / 3);
}

} // namespace quarn
