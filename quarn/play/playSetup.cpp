// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/playSetup.h"

#include "quarn/play/playing.h"
#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/PartFrames.h"
#include "quarn/scene/sceneFiles.h"

#include <array>
#include <charconv>

namespace quarn {
namespace {

// in as many digits as it has
std::string exactly(double value) {
    std::array<char, 32> digits{};
    return {digits.data(), std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr};
}

} // namespace

Setup playSetup(const PlayPlan& plan, const PartFrames& frames) {
    Setup setup;
    setup.add("quarn", QUARN_VERSION);
    setup.add("scene", plan.scene.filename().string());
    setup.add("plug", plan.mesh.name().asChar());
    frames.addTo(setup);
    setup.add("order", plan.order.isSceneOrder() ? "scene" : "file");
    setup.add("axes", plan.space.axes);
    setup.add("scale", exactly(plan.space.scale));
    setup.add("model", plan.model.name.empty() ? "(none)" : plan.model.name);
    setup.add("guard", plan.guardWidth ? exactly(*plan.guardWidth) : "(none)");
    setup.add("evaluator", plan.isOnGpu ? "gpu" : "cpu");
    addFiles(setup, sceneFiles());
    const AppliedModels models({plan.mesh});
    for (const auto& [warp, geometry] : models.geometries())
        addFiles(setup, filesOfModel(warp, geometry));
    if (!plan.scene.empty())
        setup.add("sum of the scene file", sumOfFile(plan.scene));
    return setup;
}

} // namespace quarn
