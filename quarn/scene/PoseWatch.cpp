// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/PoseWatch.h"

#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/modelFiles.h"
#include "quarn/scene/plugs.h"

#include <utility>

namespace quarn {

PoseWatch::PoseWatch(const AppliedModels& models) {
    for (const AppliedModels::Geometry& geometry : models.geometries())
        watched_.push_back({geometry, {}, false, {}});
}

void PoseWatch::look(int frame) {
    for (Watched& one : watched_) {
        if (!isModelActive(one.geometry.warp, one.geometry.geometry))
            continue;
        if (!std::exchange(one.isRead, true))
            read(one);
        if (one.counter)
            one.counter->add(frame, controlsOf(one.geometry.warp));
    }
}

void PoseWatch::read(Watched& one) {
    const auto& [warp, geometry] = one.geometry;
    ModelKnowledge knowledge = readKnowledge(modelDirectory(warp, geometry));
    one.report = {warp.name,
                  geometry.name,
                  textOf(warp.plug("models", geometry, "modelName")),
                  knowledge.why,
                  knowledge.certificate.has_value(),
                  {}};
    if (knowledge.certificate)
        one.counter.emplace(std::move(*knowledge.certificate), std::move(knowledge.poses));
}

std::vector<PoseReport> PoseWatch::reports() const {
    std::vector<PoseReport> reports;
    for (const Watched& one : watched_) {
        if (!one.isRead)
            continue;
        reports.push_back(one.report);
        if (one.counter)
            reports.back().counts = one.counter->counts();
    }
    return reports;
}

std::vector<float> controlsOf(const Warp& warp) {
    std::vector<float> controls;
    for (const double value : numbersOf(warp.plug("controlValues")))
        controls.push_back(static_cast<float>(value));
    return controls;
}

} // namespace quarn
