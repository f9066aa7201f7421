// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/targetFrames.h"

#include "quarn/console/Console.h"
#include "quarn/console/numberText.h"
#include "quarn/fit/restOrder.h"
#include "quarn/pose/cacheTimes.h"
#include "quarn/pose/sceneOrder.h"
#include "quarn/pose/targetCache.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/units.h"
#include "quarn/scene/vertexMap.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

void orderAsFile(SceneFrames& frames, const WarpGeometry& geometry, std::size_t vertices) {
    std::vector<std::int32_t> map = readVertexMap(geometry.name);
    requireFit(map, frames.cache().vertexCount(), vertices);
    frames.reorder(std::move(map), vertices);
}

// the frame of the cache that is at rest, counted from 0
std::size_t restFrameOf(const TargetFile& file, std::size_t frames) {
    const double number = file.restFrame.value_or(file.startFrame) - file.startFrame;
    const auto last = static_cast<double>(frames - 1);
    if (!(number >= 0.0 && number <= last) || number != std::floor(number))
        throw std::runtime_error("--rest-frame " + numberText(file.startFrame + number) + " is none of the frames " +
                                 numberText(file.startFrame) + "-" + numberText(file.startFrame + last) +
                                 " of the cache");
    return static_cast<std::size_t>(number);
}

void orderByRest(SceneFrames& frames, const TargetFile& file, const WarpGeometry& geometry, const Console& console) {
    std::vector<double> atRest;
    frames.read(restFrameOf(file, frames.frameCount()), atRest);
    std::vector<double> rest;
    readPoints(restMesh(geometry), rest);
    RestMatch match = matchByRest(atRest, rest, geometry.name);
    console.note("matched " + std::to_string(match.sceneVertexOf.size()) + " vertices of the cache with those of " +
                 geometry.name + " at rest, at most " + numberText(match.largestDistance) + " apart");
    if (match.guessed)
        console.warn("vertices " + std::to_string(match.guessed->first) + " and " +
                     std::to_string(match.guessed->second) + " of " + geometry.name +
                     " are in one place at rest, and others may be: which of the cache's is which is a guess, by their "
                     "order there");
    frames.reorder(std::move(match.sceneVertexOf), rest.size() / 3);
}

void requireSameVertices(const SceneFrames& frames, const TargetFile& file, const WarpGeometry& geometry,
                         std::size_t vertices) {
    if (frames.vertexCount() != vertices)
        throw std::runtime_error(file.cache.string() + " has " + std::to_string(frames.vertexCount()) +
                                 " vertices, and " + geometry.name + " has " + std::to_string(vertices) +
                                 "; --order file takes a cache with the vertices of the character's file");
}

} // namespace

SceneFrames openTargetFrames(const TargetFile& file, const WarpGeometry& geometry, const Console& console) {
    SceneFrames frames(storage::openPointCache(file.cache.string()), file.space);
    if (frames.frameCount() == 0)
        throw std::runtime_error(file.cache.string() + " has no frames");
    const std::size_t vertices = polygonsOf(restMesh(geometry)).vertexCount;
    if (file.order == "file")
        orderAsFile(frames, geometry, vertices);
    else if (file.order == "rest")
        orderByRest(frames, file, geometry, console);
    requireSameVertices(frames, file, geometry, vertices);
    for (const std::string& sentence : cacheTimesNotes(frames.cache(), file.startFrame, framesPerSecond()))
        console.note(sentence);
    return frames;
}

} // namespace quarn
