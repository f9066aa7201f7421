// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/sceneOrder.h"

#include "storage/NpyFile.h"
#include "storage/NpyWriter.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

double distanceTo(std::span<const float> point, std::span<const double> other) {
    double sum = 0.0;
    for (std::size_t axis = 0; axis < 3; ++axis)
        sum += (other[axis] - point[axis]) * (other[axis] - point[axis]);
    return std::sqrt(sum);
}

// one frame from the file's order into the scene's
class Joiner {
public:
    Joiner(const std::vector<std::int32_t>& map, std::size_t sceneVertices)
        : map_(map)
        , filePoints_(3 * map.size())
        , scenePoints_(3 * sceneVertices)
        , first_(sceneVertices, map.size()) {
        for (std::size_t vertex = map.size(); vertex-- > 0;)
            first_[static_cast<std::size_t>(map[vertex])] = vertex;
    }

    std::span<double> filePoints() { return filePoints_; }

    std::span<const float> join() {
        for (std::size_t vertex = 0; vertex < first_.size(); ++vertex)
            for (std::size_t axis = 0; axis < 3; ++axis)
                scenePoints_[3 * vertex + axis] = static_cast<float>(filePoints_[3 * first_[vertex] + axis]);
        for (std::size_t vertex = 0; vertex < map_.size(); ++vertex)
            measure(vertex, static_cast<std::size_t>(map_[vertex]));
        return scenePoints_;
    }
    double largestDistance() const { return largest_; }

private:
    void measure(std::size_t fileVertex, std::size_t sceneVertex) {
        if (first_[sceneVertex] == fileVertex)
            return;
        const double distance = distanceTo(std::span(scenePoints_).subspan(3 * sceneVertex, 3),
                                           std::span(filePoints_).subspan(3 * fileVertex, 3));
        largest_ = std::isnan(distance) ? std::numeric_limits<double>::infinity() : std::max(largest_, distance);
    }

    const std::vector<std::int32_t>& map_;
    std::vector<double> filePoints_;
    std::vector<float> scenePoints_;
    std::vector<std::size_t> first_; ///< of each vertex of the scene, the first in the file
    double largest_ = 0.0;
};

} // namespace

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

double writeInSceneOrder(const std::filesystem::path& from, const std::filesystem::path& to,
                         const std::vector<std::int32_t>& map, std::size_t sceneVertices, const Console& console) {
    const storage::NpyFile file(from.string());
    storage::NpyWriter writer(to.string(), sceneVertices);
    Joiner joiner(map, sceneVertices);
    Progress progress(console, "joining vertices", std::max<std::size_t>(1, file.frameCount()));
    for (std::size_t frame = 0; frame < file.frameCount(); ++frame) {
        file.read(frame, 0, joiner.filePoints());
        writer.append(joiner.join());
        progress.advance();
    }
    writer.finish();
    return joiner.largestDistance();
}

} // namespace quarn
