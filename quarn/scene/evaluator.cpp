// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/evaluator.h"

#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"

#include "openquarn_app/Gpu.h"
#include "openquarn_app/Plugins.h"

#include <algorithm>
#include <stdexcept>
#include <vector>

namespace quarn {
namespace {

bool hasGpuDeformer(const std::string& plugin) {
    const std::vector<std::string> types = OpenQuarn::pluginInfo(plugin).gpuDeformers;
    return std::find(types.begin(), types.end(), "neuralWarp") != types.end();
}

} // namespace

void chooseEvaluator(const std::string& evaluator, const std::string& device) {
    const bool isGpu = evaluator == "gpu";
    if (!isGpu && !device.empty())
        throw UsageError("--device " + device + " goes with --evaluator gpu");
    if (isGpu) {
        const std::vector<std::string> plugins = OpenQuarn::loadedPlugins();
        if (std::none_of(plugins.begin(), plugins.end(), hasGpuDeformer))
            throw std::runtime_error("no loaded plug-in registers a GPU deformer for neuralWarp: use --evaluator cpu, "
                                     "or load a plug-in that does with --plugin");
        OpenQuarn::Gpu::chooseDevice(device);
    }
    OpenQuarn::Gpu::setEnabled(isGpu);
    OpenQuarn::Gpu::resetCounts();
    log([&] { return "deformers run on the " + evaluator + (device.empty() ? "" : ", on device " + device); });
}

GpuUse gpuUse() {
    const std::optional<OpenQuarn::GpuDevice> device = OpenQuarn::Gpu::currentDevice();
    const OpenQuarn::GpuCounts counts = OpenQuarn::Gpu::counts();
    return {device ? device->name : "", counts.gpuEvaluations, counts.cpuEvaluations, counts.fallbacks};
}

} // namespace quarn
