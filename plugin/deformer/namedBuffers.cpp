// SPDX-License-Identifier: Apache-2.0
#include "deformer/namedBuffers.h"

#include "openquarn/TapiCastAnim.h"

#include <algorithm>
#include <array>
#include <memory>

namespace neuralWarp {
namespace {

constexpr std::size_t initialCapacity = 8;

template <class To, class From, class Convert>
HObject published(const std::vector<From>& buffer, Convert convert) {
    auto array = std::make_unique<TArray<To>>(initialCapacity, buffer.size());
    std::transform(buffer.begin(), buffer.end(), array->begin(), convert);
    return TapiCastAnim::convertArrayToObject(array.release());
}

template <class Number>
HObject publishedNumbers(const std::vector<Number>& buffer) {
    return published<Number>(buffer, [](Number number) { return number; });
}

HObject publishedPoints(const Points& points) {
    return published<T3dFltVector>(points, [](const quill::val3<float>& p) { return T3dFltVector{p.x, p.y, p.z}; });
}

HObject publishedMatrices(const std::vector<quill::mat4d>& matrices) {
    return published<T4dDblMatrix>(matrices, [](const quill::mat4d& from) {
        T4dDblMatrix matrix;
        for (unsigned row = 0; row < 4; ++row)
            for (unsigned column = 0; column < 4; ++column)
                matrix[row][column] = from(row, column);
        return matrix;
    });
}

struct Buffer {
    std::string_view name;
    HObject (*publish)(const neuralWarpData&);
};

using Data = neuralWarpData;
constexpr std::array buffers = {
    Buffer{"Sync", [](const Data& d) { return publishedNumbers(d.cacheVersions); }},
    Buffer{"FramesIndexer", [](const Data& d) { return publishedNumbers(d.vertexFrames.framesIndexer()); }},
    Buffer{"FramesPairs", [](const Data& d) { return publishedNumbers(d.vertexFrames.framesPairs()); }},
    Buffer{"Connections", [](const Data& d) { return publishedNumbers(d.vertexConnections.connections()); }},
    Buffer{"ConnectionsIndexer",
           [](const Data& d) { return publishedNumbers(d.vertexConnections.connectionsIndexer()); }},
    Buffer{"ConnectionWeights", [](const Data& d) { return publishedNumbers(d.connectionWeights.get()); }},
    Buffer{"AffectToDeltaMap", [](const Data& d) { return publishedNumbers(d.affectMap); }},
    Buffer{"OriginalVerts", [](const Data& d) { return publishedPoints(d.restPoints); }},
    Buffer{"SmoothOriginalFramesInverse", [](const Data& d) { return publishedMatrices(d.restFramesInverse); }},
    Buffer{"PrincipalShapesData", [](const Data& d) { return publishedNumbers(d.principalShapes.slotMajor()); }},
};

} // namespace

HObject namedBuffer(const neuralWarpData& data, std::string_view name) {
    for (const Buffer& buffer : buffers)
        if (buffer.name == name)
            return buffer.publish(data);
    return {};
}

} // namespace neuralWarp
