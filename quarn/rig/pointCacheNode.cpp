// SPDX-License-Identifier: Apache-2.0
#include "rig/pointCacheNode.h"

#include "openquarn/HFileObject.h"
#include "openquarn/HFnMesh.h"
#include "openquarn_helpers/AttributeMaker.h"
#include "storage/PointCache.h"
#include "storage/framePattern.h"

#include <algorithm>
#include <cmath>
#include <exception>
#include <initializer_list>
#include <new>
#include <stdexcept>
#include <string>
#include <vector>

namespace rig {

using openquarn_helpers::AttributeMaker;
using openquarn_helpers::outputFlags;

const HTypeId pointCacheNode::id(0x6e770021);
const HString pointCacheNode::typeName("pointCache");

HObject pointCacheNode::cacheFile;
HObject pointCacheNode::time;
HObject pointCacheNode::startFrame;
HObject pointCacheNode::interpolate;
HObject pointCacheNode::inMesh;
HObject pointCacheNode::replacedMesh;
HObject pointCacheNode::outMesh;

pointCacheNode::pointCacheNode() = default;
pointCacheNode::~pointCacheNode() = default;

HPxNode* pointCacheNode::create() {
    return new (std::nothrow) pointCacheNode;
}

HStatus pointCacheNode::initialize() {
    AttributeMaker make;
    cacheFile = make.data("cacheFile", "cf", HFnData::kString, {.filename = true});
    time = make.real("time", "t", 1.0);
    startFrame = make.real("startFrame", "sf", 1.0, {.keyable = false});
    interpolate = make.boolean("interpolate", "ip", true, {.keyable = false});
    inMesh = make.data("inMesh", "inm", HFnData::kMesh);
    outMesh = make.data("outMesh", "outm", HFnData::kMesh, outputFlags);
    replacedMesh = make.data("replacedMesh", "rm", HFnData::kMesh);
    make.add({cacheFile, time, startFrame, interpolate, inMesh, outMesh, replacedMesh});
    make.affects({cacheFile, time, startFrame, interpolate, inMesh}, {outMesh});
    return make.status();
}

namespace {

using Node = pointCacheNode;

/// Between a frame of the file and the next one.
struct Place {
    std::size_t frame;
    double fraction; ///< of the way to the next frame; 0 where only `frame` is wanted
};

/// Where in a file of `frames` frames the time is; the first or the last frame where it has none.
Place placeAt(double offset, std::size_t frames, bool interpolate) {
    // times that come from seconds miss whole frames by a hair, and must not show the frame before
    constexpr double hair = 1e-6;
    if (std::abs(offset - std::round(offset)) < hair)
        offset = std::round(offset);
    const auto last = static_cast<double>(frames - 1);
    const double held = std::clamp(offset, 0.0, last);
    const double lower = std::floor(held);
    return {static_cast<std::size_t>(lower), interpolate ? held - lower : 0.0};
}

/// The points of the file at a place, read in pieces that stay in the cache of the processor.
HPointArray pointsAt(const storage::PointCache& file, const Place& place) {
    constexpr std::size_t pieceSize = 1024;
    std::vector<double> lower(3 * std::min(pieceSize, file.vertexCount()));
    std::vector<double> upper(place.fraction > 0.0 ? lower.size() : 0);
    HPointArray points(static_cast<unsigned>(file.vertexCount()));
    for (std::size_t first = 0; first < points.length(); first += pieceSize) {
        const std::size_t count = std::min<std::size_t>(pieceSize, points.length() - first);
        file.read(place.frame, first, std::span(lower).first(3 * count));
        if (!upper.empty()) {
            file.read(place.frame + 1, first, std::span(upper).first(3 * count));
            for (std::size_t i = 0; i < 3 * count; ++i)
                lower[i] += place.fraction * (upper[i] - lower[i]);
        }
        for (std::size_t i = 0; i < count; ++i)
            points[static_cast<unsigned>(first + i)] = HPoint(lower[3 * i], lower[3 * i + 1], lower[3 * i + 2]);
    }
    return points;
}

void require(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

HDataHandle inputOf(HDataBlock& block, const HObject& attribute) {
    HStatus status;
    HDataHandle handle = block.inputValue(attribute, &status);
    require(status);
    return handle;
}

/// Throws when the file has no points for the mesh.
void requireFit(const storage::PointCache& file, const HObject& mesh) {
    if (mesh.isNull())
        throw std::runtime_error("inMesh holds no mesh for '" + file.path() + "', which has points only");
    const auto vertices = static_cast<std::size_t>(HFnMesh(mesh).numVertices());
    if (file.vertexCount() != vertices)
        throw std::runtime_error("point cache '" + file.path() + "' has " + std::to_string(file.vertexCount()) +
                                 " vertices, and inMesh has " + std::to_string(vertices));
    if (file.frameCount() == 0)
        throw std::runtime_error("point cache '" + file.path() + "' has no frames");
}

} // namespace

HStatus pointCacheNode::compute(const HPlug& plug, HDataBlock& block) {
    if (plug.attribute() != outMesh)
        return HStatus::kUnknownParameter;
    HStatus status;
    HObject mesh = block.inputValue(inMesh, &status).asMesh();
    if (status.error())
        return status;
    const HStatus moved = moveToCache(block, mesh);
    status = block.outputValue(outMesh).set(mesh);
    if (!status.error())
        status = block.setClean(plug);
    return moved.error() ? moved : status;
}

/// Gives the mesh the points of the file. After a failure it is as it was.
HStatus pointCacheNode::moveToCache(HDataBlock& block, HObject& mesh) {
    try {
        const HString rawPath = inputOf(block, cacheFile).asString();
        if (rawPath.isEmpty()) {
            file_.reset();
            return HStatus::kSuccess;
        }
        const double offset = inputOf(block, time).asDouble() - inputOf(block, startFrame).asDouble();
        openFile(rawPath);
        requireFit(*file_, mesh);
        if (std::isnan(offset))
            throw std::runtime_error("time minus startFrame is no number for '" + file_->path() + "'");
        const Place place = placeAt(offset, file_->frameCount(), inputOf(block, interpolate).asBool());
        HFnMesh moved(mesh);
        require(moved.setPoints(pointsAt(*file_, place)));
        mesh = moved.object();
        return HStatus::kSuccess;
    } catch (const std::exception& error) {
        return {HStatus::kFailure, name().asStdString() + ": " + error.what()};
    }
}

void pointCacheNode::openFile(const HString& rawPath) {
    HFileObject resolver;
    resolver.setRawFullName(rawPath);
    const std::string path = resolver.resolvedFullName().asStdString();
    if (file_ && file_->path() == path && storage::identityOf(path) == file_->identity())
        return;
    file_.reset();
    // would be read as a whole in every frame
    if (storage::isFramePattern(path) && storage::cacheFormatOf(path) == storage::CacheFormat::obj &&
        !storage::identityOf(path))
        throw std::runtime_error("'" + path + "' is a sequence of files: quarn target --cache makes one cache of it");
    file_ = storage::openPointCache(path);
}

void pointCacheNode::getExternalContent(HExternalContentInfoTable& table) const {
    addExternalContentForFileAttr(table, cacheFile);
    HPxNode::getExternalContent(table);
}

void pointCacheNode::setExternalContent(const HExternalContentLocationTable& table) {
    setExternalContentForFileAttr(cacheFile, table);
    HPxNode::setExternalContent(table);
}

} // namespace rig
