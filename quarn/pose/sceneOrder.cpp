// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/sceneOrder.h"

#include "quarn/pose/SceneFrames.h"
#include "storage/NpyWriter.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {

void requireFit(const std::vector<std::int32_t>& map, std::size_t fileVertices, std::size_t sceneVertices) {
    if (map.size() != fileVertices)
        throw std::runtime_error("the cache has " + std::to_string(fileVertices) +
                                 " vertices, and the character's file has " + std::to_string(map.size()));
    std::vector<bool> covered(sceneVertices, false);
    for (std::size_t vertex = 0; vertex < map.size(); ++vertex) {
        if (map[vertex] < 0 || static_cast<std::size_t>(map[vertex]) >= sceneVertices)
            throw std::runtime_error("the character's vertex map says that vertex " + std::to_string(vertex) +
                                     " of the file is vertex " + std::to_string(map[vertex]) +
                                     " of the scene's mesh, which has " + std::to_string(sceneVertices));
        covered[static_cast<std::size_t>(map[vertex])] = true;
    }
    const auto missing = std::find(covered.begin(), covered.end(), false);
    if (missing != covered.end())
        throw std::runtime_error("the character's vertex map has no vertex of the file for vertex " +
                                 std::to_string(missing - covered.begin()) + " of the scene's mesh, which has " +
                                 std::to_string(sceneVertices));
}

void writeSceneFrames(SceneFrames& frames, const std::filesystem::path& to, const Console& console) {
    storage::NpyWriter writer(to.string(), frames.vertexCount());
    std::vector<double> xyz;
    std::vector<float> singles(3 * frames.vertexCount());
    Progress progress(console, "converting the cache", std::max<std::size_t>(1, frames.frameCount()));
    for (std::size_t frame = 0; frame < frames.frameCount(); ++frame) {
        frames.read(frame, xyz);
        std::transform(xyz.begin(), xyz.end(), singles.begin(), [](double value) { return static_cast<float>(value); });
        writer.append(singles);
        progress.advance();
    }
    writer.finish();
}

} // namespace quarn
