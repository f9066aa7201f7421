// SPDX-License-Identifier: Apache-2.0
#include "kinds.h"
#include "values.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/bulk.h"
#include "support/meshZoo.h"

#include <optional>
#include <stdexcept>

namespace replay {
namespace {

using Points = std::vector<quill::val3<float>>;

template <typename T>
Json replayPairs(const Json& pairs, JsonAllocator& allocator) {
    Json results(rapidjson::kArrayType);
    for (const Json& pair : pairs.GetArray()) {
        const auto a = readVector<T>(pair[0]);
        const auto b = readVector<T>(pair[1]);
        auto unit = a;
        unit.normalize();
        Output out(allocator);
        out.set("dot", dot(a, b));
        out.set("cross", cross(a, b));
        out.set("length", length(a));
        out.set("normalize", unit);
        results.PushBack(out.take(), allocator);
    }
    return results;
}

quill::MeshTopology readTopology(const Json& polygons, std::size_t vertexCount) {
    std::vector<std::vector<std::uint32_t>> lists;
    for (const Json& polygon : polygons.GetArray())
        lists.push_back(readIndices(polygon));
    return makeTopology(lists, vertexCount);
}

quill::IndexMapper readMap(const Json& affected, std::size_t fullCount) {
    quill::IndexMapper map;
    if (affected.IsNull())
        map.setIdentity(fullCount);
    else
        map.set(readIndices(affected), fullCount);
    return map;
}

template <typename T>
std::optional<std::vector<T>> readOptional(const Json& list) {
    if (list.IsNull())
        return std::nullopt;
    std::vector<T> values;
    for (const std::uint32_t value : readIndices(list))
        values.push_back(static_cast<T>(value));
    return values;
}

template <typename T>
const T* pointerTo(const std::optional<T>& value) {
    return value ? &*value : nullptr;
}

Json connectionTables(const quill::VertexConnections& connections, JsonAllocator& allocator) {
    Output out(allocator);
    out.set("connections", connections.connections());
    out.set("connectionsIndexer", connections.connectionsIndexer());
    return out.take();
}

Json frameTables(const quill::VertexFrames& frames, JsonAllocator& allocator) {
    Output out(allocator);
    out.set("framesPairs", frames.framesPairs());
    out.set("framesIndexer", frames.framesIndexer());
    return out.take();
}

// The full indices of the mesh and one past it, and the marker of a missing one.
std::vector<std::uint32_t> everyAffected(const quill::IndexMapper& map) {
    std::vector<std::uint32_t> indices;
    for (std::size_t full = 0; full <= map.fullCount(); ++full)
        indices.push_back(map.toAffected(static_cast<std::uint32_t>(full)));
    return indices;
}

} // namespace

Json replayVal3(Input& input, JsonAllocator& allocator) {
    const std::string component = readText(input["component"]);
    if (component == "float")
        return replayPairs<float>(input["pairs"], allocator);
    if (component == "double")
        return replayPairs<double>(input["pairs"], allocator);
    throw std::runtime_error("the component type \"" + component + "\" is not known");
}

Json replayMatrix(Input& input, JsonAllocator& allocator) {
    const quill::mat4d a = readMatrix(input["a"]);
    const quill::mat4d b = readMatrix(input["b"]);
    const Points points = readVectors<float>(input["points"]);
    const std::vector<quill::mat4d> frames{a, b};

    quill::mat4d inverse = a, gaussJordan = a;
    inverse.inverse();
    gaussJordan.gaussJordanInverse();
    Points asPoint, asVector, bulkPoints = points;
    for (const auto& p : points) {
        asPoint.push_back(transformAsPoint(p, a));
        asVector.push_back(transformAsVector(p, a));
    }
    quill::multAsPoint(bulkPoints, a);
    auto multiplied = frames, inverted = frames;
    quill::multFrames(multiplied, b);
    quill::invertFrames(inverted);
    std::vector<float> floats;
    quill::convertToFloatArray(frames, floats);

    Output out(allocator);
    out.set("product", a * b);
    out.set("determinant", a.determinant());
    out.set("inverse", inverse);
    out.set("gaussJordan", gaussJordan);
    out.set("isIdentity1e-6", a.isIdentity(1e-6));
    out.set("asPoint", asPoint);
    out.set("asVector", asVector);
    out.set("multAsPoint", bulkPoints);
    out.set("multFramesByB", multiplied);
    out.set("invertFrames", inverted);
    out.set("convertToFloatArray", floats);
    return out.take();
}

Json replayMesh(Input& input, JsonAllocator& allocator) {
    const std::size_t fullCount = readCount(input["fullCount"]);
    const auto topology = readTopology(input["polygons"], fullCount);
    const auto map = readMap(input["affected"], fullCount);
    const Points positions = readVectors<float>(input["positions"]);
    const Points points = readVectors<float>(input["points"]);
    const Points deltas = readVectors<float>(input["deltas"]);
    const auto mask = readOptional<std::uint8_t>(input["mask"]);
    const auto subset = readOptional<std::uint32_t>(input["subset"]);
    Output out(allocator);
    out.set("toAffected", everyAffected(map));

    quill::VertexConnections rings, connections;
    rings.build(topology, map, readCount(input["extraRings"]), readBool(input["includeSelf"]));
    connections.build(topology, map, 0, false);
    out.set("rings", connectionTables(rings, allocator));
    out.set("connections", connectionTables(connections, allocator));

    std::vector<float> weights;
    connections.calculateConnectionWeights(weights, positions, readNumber(input["exponent"]),
                                           readNumber(input["offset"]));
    out.set("weights", weights);

    Points mushed = positions, scratch(positions.size());
    connections.mushArray(mushed, scratch, readCount(input["iterations"]),
                          static_cast<float>(readNumber(input["step"])), pointerTo(mask),
                          readBool(input["useWeights"]) ? &weights : nullptr, readBool(input["mushIncludeSelf"]));
    out.set("mushArray", mushed);
    out.set("mushScratch", scratch);

    quill::VertexFrames frames, framesWithoutPositions;
    frames.build(topology, map, &positions);
    framesWithoutPositions.build(topology, map, nullptr);
    out.set("frames", frameTables(frames, allocator));
    out.set("framesWithoutPositions", frameTables(framesWithoutPositions, allocator));

    std::vector<quill::mat4d> plain, inverted, smoothed;
    frames.calculateFrames(plain, positions, map, false, pointerTo(subset));
    frames.calculateFrames(inverted, positions, map, true, nullptr);
    frames.calculateFrames(smoothed, positions, connections.connectionsIndexer(), connections.connections(), weights,
                           readCount(input["normalIterations"]), map, false, pointerTo(subset));
    out.set("calculateFrames", plain);
    out.set("calculateFramesInverted", inverted);
    out.set("calculateFramesSmoothed", smoothed);

    Points displacements;
    frames.calculateDisplacements(positions, points, displacements);
    out.set("calculateDisplacements", displacements);

    // positions at rest carried to points, both measured after one gentle smoothing pass
    Points rest = positions, current = points;
    connections.mushArray(rest, scratch, 1, 0.25F, nullptr, &weights, false);
    connections.mushArray(current, scratch, 1, 0.25F, nullptr, &weights, false);
    std::vector<quill::mat4d> restInverse;
    frames.calculateFrames(restInverse, rest, map, true, nullptr);
    Points transported(positions.size());
    frames.transportDeltas(transported, deltas, positions, restInverse, current, nullptr);
    out.set("transport", transported);
    return out.take();
}

} // namespace replay
