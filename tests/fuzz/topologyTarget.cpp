// SPDX-License-Identifier: Apache-2.0
#include "topologyTarget.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"

#include <algorithm>
#include <bit>
#include <cstdlib>

namespace {

void require(bool condition) {
    if (!condition)
        std::abort();
}

// Takes small numbers off the front of the input; zeros when it is used up.
class Bytes {
public:
    Bytes(const std::uint8_t* data, std::size_t size)
        : data_(data)
        , end_(data + size) {}

    std::uint8_t byte() { return data_ == end_ ? std::uint8_t{0} : *data_++; }
    bool bit() { return byte() % 2 == 1; }

    // Mostly small; the largest byte stands for a number from anywhere.
    std::uint32_t index() {
        const std::uint8_t small = byte();
        return small != 0xFF ? small : static_cast<std::uint32_t>(byte()) << 24U | byte();
    }
    std::vector<std::uint32_t> indices() {
        std::vector<std::uint32_t> list(byte());
        std::generate(list.begin(), list.end(), [this] { return index(); });
        return list;
    }
    float coordinate() {
        const std::uint8_t small = byte();
        if (small != 0xFF)
            return static_cast<float>(small) * 0.125F;
        // any bits at all: huge, tiny, infinite, not a number
        return std::bit_cast<float>(static_cast<std::uint32_t>(byte()) << 24U | static_cast<std::uint32_t>(byte())
                                                                                    << 16U);
    }

private:
    const std::uint8_t* data_;
    const std::uint8_t* end_;
};

quill::IndexMapper readMap(Bytes& bytes) {
    quill::IndexMapper map;
    const bool identity = bytes.bit();
    const std::size_t fullCount = bytes.byte();
    if (identity)
        map.setIdentity(fullCount);
    else
        map.set(bytes.indices(), fullCount);
    return map;
}

void requireTable(const std::vector<std::uint32_t>& indexer, const std::vector<std::uint32_t>& entries,
                  std::size_t count) {
    require(indexer.size() == count + 1 && indexer.front() == 0 && indexer.back() == entries.size());
    require(std::is_sorted(indexer.begin(), indexer.end()));
    require(std::all_of(entries.begin(), entries.end(), [=](std::uint32_t entry) { return entry < count; }));
}

} // namespace

bool fuzzTopology(const std::uint8_t* data, std::size_t size) {
    Bytes bytes(data, size);
    const auto map = readMap(bytes);
    quill::MeshTopology topology;
    topology.polygonOffsets = bytes.indices();
    topology.polygonVertices = bytes.indices();
    topology.polygonCount = bytes.bit() ? bytes.index() : topology.polygonOffsets.size();
    const std::size_t rings = bytes.byte() % 4;
    const bool self = bytes.bit(), masked = bytes.bit(), invert = bytes.bit();
    const auto subset = bytes.indices();
    const std::size_t count = map.affectCount();
    std::vector<quill::val3<float>> points(count);
    for (auto& p : points)
        p = {bytes.coordinate(), bytes.coordinate(), bytes.coordinate()};

    quill::VertexConnections connections;
    connections.build(topology, map, rings, self);
    requireTable(connections.connectionsIndexer(), connections.connections(), count);
    std::vector<float> weights;
    connections.calculateConnectionWeights(weights, points, bytes.coordinate(), bytes.coordinate());
    require(weights.size() == connections.connections().size());
    std::vector<std::uint8_t> mask(count, 1);
    auto smoothed = points, scratch = points;
    connections.mushArray(smoothed, scratch, 3, bytes.coordinate(), masked ? &mask : nullptr, &weights, self);

    quill::VertexFrames frames;
    frames.build(topology, map, invert ? &points : nullptr);
    requireTable(frames.framesIndexer(), frames.framesPairs(), count);
    require(frames.framesPairs().size() % 2 == 0);
    std::vector<quill::mat4d> matrices;
    frames.calculateFrames(matrices, smoothed, connections.connectionsIndexer(), connections.connections(), weights,
                           rings, map, invert, masked ? &subset : nullptr);
    require(matrices.size() == count);
    frames.calculateDisplacements(smoothed, points, scratch);
    // tables from anywhere: the offsets and corners themselves
    frames.calculateFrames(matrices, smoothed, topology.polygonOffsets, topology.polygonVertices, weights, 2, map,
                           invert, &subset);
    return !connections.connections().empty() && !frames.framesPairs().empty();
}
