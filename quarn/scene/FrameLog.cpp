// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/FrameLog.h"

#include "openquarn_app/Usage.h"
#include "quarn/console/Log.h"

#include <set>
#include <string>

namespace quarn {
namespace {

// the deformer counts them
std::size_t loadedModels() {
    for (const OpenQuarn::UsageEvent& event : OpenQuarn::Usage::events())
        if (event.name == "QUARN.NEURAL_WARP_LOADED_MODEL")
            return event.count;
    return 0;
}

std::size_t nodesOf(const std::vector<std::string>& plugs) {
    std::set<std::string> nodes;
    for (const std::string& plug : plugs)
        nodes.insert(plug.substr(0, plug.find('.')));
    return nodes.size();
}

} // namespace

FrameLog::FrameLog(int frame)
    : frame_(frame) {
    if (!Log::isOn())
        return;
    computed_.emplace();
    modelsBefore_ = loadedModels();
    begin_ = std::chrono::steady_clock::now();
}

FrameLog::~FrameLog() {
    if (!computed_)
        return;
    const std::string time = millisecondsText(std::chrono::steady_clock::now() - begin_);
    const std::size_t models = loadedModels() - modelsBefore_;
    Log::write("frame " + std::to_string(frame_) + ": " + std::to_string(computed_->plugs().size()) + " plugs of " +
               std::to_string(nodesOf(computed_->plugs())) + " nodes computed, " +
               (models > 0 ? std::to_string(models) + " model loaded, " : "") + time);
}

} // namespace quarn
