// SPDX-License-Identifier: Apache-2.0
#include "quarn/fit/findings.h"
#include "quarn/fit/restOrder.h"

#include <stdexcept>

namespace quarn {
namespace {

// where the most is known of where vertices are: at rest, if any frame is
const SkinFrames::Frame* clearestFrame(const SkinFrames& skin, const CacheChange& base) {
    const SkinFrames::Frame* clearest = nullptr;
    for (const SkinFrames::Frame& frame : skin.frames())
        if (skin.cacheFrame(frame, base.shift) && (clearest == nullptr || (frame.atRest && !clearest->atRest)))
            clearest = &frame;
    return clearest;
}

// empty where vertices have no partner each
std::vector<std::int32_t> sceneVertices(const SkinFrames::Frame& frame, const std::vector<double>& cache,
                                        const CacheChange& base) {
    std::vector<double> moved;
    moved.reserve(cache.size());
    for (std::size_t vertex = 0; vertex < cache.size() / 3; ++vertex)
        for (const double coordinate : base.of(cache, vertex))
            moved.push_back(coordinate);
    try {
        return matchByRest(moved, std::vector<double>(frame.xyz.begin(), frame.xyz.end()), "the mesh").sceneVertexOf;
    } catch (const std::runtime_error&) {
        return {};
    }
}

} // namespace

Finding findOrder(const SkinFrames& skin, const CacheChange& base) {
    Finding finding;
    const SkinFrames::Frame* frame = clearestFrame(skin, base);
    if (frame == nullptr)
        return finding;
    const std::size_t number = *skin.cacheFrame(*frame, base.shift);
    std::vector<double> cache;
    skin.input().cache(number, cache);
    const std::vector<std::int32_t> match = sceneVertices(*frame, cache, base);
    finding.change = base;
    finding.change.order.resize(match.size());
    for (std::size_t vertex = 0; vertex < match.size(); ++vertex)
        finding.change.order[static_cast<std::size_t>(match[vertex])] = static_cast<std::uint32_t>(vertex);
    if (match.empty())
        return finding;
    if (frame->atRest)
        finding.restFrame = number;
    finding.before = skin.pairs(base).meanDistance();
    finding.after = skin.pairs(finding.change).meanDistance();
    return finding;
}

} // namespace quarn
