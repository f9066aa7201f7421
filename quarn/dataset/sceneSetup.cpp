// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/sceneSetup.h"

#include "quarn/scene/sceneFiles.h"

#include "storage/Fnv64.h"

#include <span>

namespace quarn {
namespace {

std::string sumOf(const HUintArray& numbers) {
    storage::Fnv64 sum;
    for (const unsigned number : numbers)
        sum.add(std::as_bytes(std::span(&number, 1)));
    return sum.text();
}

} // namespace

Setup sceneSetup(const std::filesystem::path& sceneFile, const Warp& warp, const WarpGeometry& geometry,
                 const FrameSampler& sampler, const PartFrames& frames) {
    Setup setup;
    setup.add("quarn", QUARN_VERSION);
    setup.add("scene", sceneFile.filename().string());
    setup.add("deformer", warp.name);
    setup.add("geometry", std::to_string(geometry.index) + " " + geometry.name);
    frames.addTo(setup);
    setup.add("delta type", sampler.kind().code());
    setup.add("smoothing iterations", static_cast<std::size_t>(sampler.kind().smoothingIterations));
    setup.add("vertices", sampler.map().fullCount());
    setup.add("deformed vertices", sampler.map().affectCount());
    setup.add("sum of deformed vertices", sumOf(sampler.map().affectMap()));
    setup.add("target", geometry.target.name().asChar());
    addFiles(setup, sceneFiles()); // models have no part in training data
    setup.add("controls", sampler.names().size());
    for (std::size_t i = 0; i < sampler.names().size(); ++i)
        setup.add("control " + std::to_string(i), sampler.names()[i]);
    setup.add("sum of the scene file", sumOfFile(sceneFile));
    return setup;
}

} // namespace quarn
