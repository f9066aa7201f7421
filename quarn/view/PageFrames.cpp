// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/PageFrames.h"

#include "openquarn/HMatrix.h"
#include "quarn/scene/FramePlayer.h"
#include "quarn/scene/PoseWatch.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/plugs.h"
#include "rig/linearBlend.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

[[noreturn]] void refuse(int frame, const std::string& what) {
    throw std::runtime_error("frame " + std::to_string(frame) + ": " + what);
}

void addPoints(const HPlug& mesh, int frame, PageFrames& frames, std::vector<float>& all) {
    std::vector<float> xyz;
    readPoints(mesh, xyz);
    requireFinite(xyz, mesh, frame);
    if (xyz.size() != 3 * frames.vertexCount)
        refuse(frame, std::string(mesh.name().asChar()) + " has " + std::to_string(xyz.size() / 3) +
                          " vertices, and the deformed mesh has " + std::to_string(frames.vertexCount));
    all.insert(all.end(), xyz.begin(), xyz.end());
}

void requireModel(const FrameSource& source, int frame) {
    if (!isModelActive(source.warp, source.geometry))
        refuse(frame, "the model of " + source.warp.name + " is off; a page shows one that is on in all its frames");
    const bool isMorphOn = numberOf(source.warp.plug("targetMorphEnabled")) != 0.0 &&
                           numberOf(source.warp.plug("targetMorphEnvelope")) != 0.0;
    if (isMorphOn)
        refuse(frame, "the target morph of " + source.warp.name + " is on (" + source.warp.name +
                          ".targetMorphEnabled); a page shows what the model does");
}

void addControls(const FrameSource& source, int frame, PageFrames& frames) {
    const std::vector<float> controls = controlsOf(source.warp);
    if (controls.size() < source.controlCount)
        refuse(frame, source.warp.name + ".controlValues has " + std::to_string(controls.size()) +
                          " values, and the network takes " + std::to_string(source.controlCount));
    for (std::size_t i = 0; i < source.controlCount; ++i) {
        if (!std::isfinite(controls[i]))
            refuse(frame, "number " + std::to_string(i) + " of " + source.warp.name + ".controlValues is not finite");
        frames.controls.push_back(controls[i]);
    }
}

void addChain(const InputChain& chain, PageFrames& frames) {
    for (const InputChain::Influence& influence : chain.influences)
        for (const double number : rig::affineOf(matrixOf(influence.bind) * matrixOf(influence.matrix)))
            frames.matrices.push_back(static_cast<float>(number));
    const std::vector<double> weights = shapeWeights(chain.shapes);
    frames.weights.insert(frames.weights.end(), weights.begin(), weights.end());
}

void addRig(const RigChain& rig, PageFrames& frames) {
    for (const RigChain::Slider& slider : rig.sliders)
        frames.sliders.push_back(numberOf(slider.plug));
    for (const RigChain::Animated& animated : rig.animated)
        frames.animated.push_back(numberOf(animated.plug));
}

} // namespace

void readFrame(const FrameSource& source, int frame, PageFrames& frames) {
    requireModel(source, frame);
    addPoints(source.geometry.input, frame, frames, frames.input);
    addPoints(source.geometry.output, frame, frames, frames.output);
    if (source.hasTarget)
        addPoints(source.geometry.target, frame, frames, frames.target);
    addControls(source, frame, frames);
    frames.envelope.push_back(static_cast<float>(numberOf(source.warp.plug("envelope"))));
    if (source.chain)
        addChain(*source.chain, frames);
    if (source.rig)
        addRig(*source.rig, frames);
    frames.numbers.push_back(frame);
}

} // namespace quarn
