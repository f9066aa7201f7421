// SPDX-License-Identifier: Apache-2.0
#include "topologyTarget.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "require.h"

#include <algorithm>
#include <bit>

#include <tbb/global_control.h>

namespace {

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

bool useTopology(const quill::MeshTopology& topology, const quill::IndexMapper& map, const TopologyUse& use) {
    const std::size_t count = map.affectCount();
    quill::VertexConnections connections;
    connections.build(topology, map, use.rings, use.self);
    requireTable(connections.connectionsIndexer(), connections.connections(), count);
    std::vector<float> weights;
    connections.calculateConnectionWeights(weights, use.points, use.exponent, use.offset);
    require(weights.size() == connections.connections().size());
    std::vector<std::uint8_t> mask(count, 1);
    auto smoothed = use.points, scratch = use.points;
    connections.mushArray(smoothed, scratch, 3, use.step, use.masked ? &mask : nullptr, &weights, use.self);

    quill::VertexFrames frames;
    frames.build(topology, map, use.invert ? &use.points : nullptr);
    requireTable(frames.framesIndexer(), frames.framesPairs(), count);
    require(frames.framesPairs().size() % 2 == 0);
    std::vector<quill::mat4d> matrices;
    frames.calculateFrames(matrices, smoothed, connections.connectionsIndexer(), connections.connections(), weights,
                           use.rings, map, use.invert, use.masked ? &use.subset : nullptr);
    require(matrices.size() == count);
    frames.calculateDisplacements(smoothed, use.points, scratch);
    // tables from anywhere: the offsets and corners themselves
    frames.calculateFrames(matrices, smoothed, topology.polygonOffsets, topology.polygonVertices, weights, 2, map,
                           use.invert, &use.subset);
    return !connections.connections().empty() && !frames.framesPairs().empty();
}

bool fuzzTopology(const std::uint8_t* data, std::size_t size) {
    // coverage then depends on the input alone
    const tbb::global_control oneThread(tbb::global_control::max_allowed_parallelism, 1);
    Bytes bytes(data, size);
    const auto map = readMap(bytes);
    quill::MeshTopology topology;
    topology.polygonOffsets = bytes.indices();
    topology.polygonVertices = bytes.indices();
    topology.polygonCount = bytes.bit() ? bytes.index() : topology.polygonOffsets.size();
    TopologyUse use;
    use.rings = bytes.byte() % 4;
    use.self = bytes.bit();
    use.masked = bytes.bit();
    use.invert = bytes.bit();
    use.subset = bytes.indices();
    use.points.resize(map.affectCount());
    for (auto& p : use.points)
        p = {bytes.coordinate(), bytes.coordinate(), bytes.coordinate()};
    use.exponent = bytes.coordinate();
    use.offset = bytes.coordinate();
    use.step = bytes.coordinate();
    return useTopology(topology, map, use);
}
