// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/ClipFile.h"

#include "quarn/console/numberText.h"
#include "quarn/play/fitClip.h"
#include "quarn/scene/vertexNormals.h"

#include <algorithm>
#include <limits>
#include <stdexcept>

namespace quarn {
namespace {

constexpr std::uint64_t bytesPerVertex = 6 * sizeof(float); // position and normal

constexpr double millimetresPerMeter = 1000.0;

std::string inGigabytes(std::uint64_t bytes) {
    return std::to_string(bytes / 1'000'000'000) + "." + std::to_string(bytes / 100'000'000 % 10) + " GB";
}

} // namespace

ClipFile::ClipFile(const std::filesystem::path& path, MeshPolygons polygons, ClipMotion motion)
    : path_(path)
    , file_(path)
    , polygons_(std::move(polygons))
    , vertices_(polygons_)
    , motion_(std::move(motion)) {
    if (vertices_.triangles.empty())
        throw std::runtime_error(path.string() + ": glTF has no meshes without triangles: write .usda or .pc2");
    if (const std::uint64_t bytes = expectedBytes(); bytes > std::numeric_limits<std::uint32_t>::max())
        throw std::runtime_error(path.string() + " would have " + inGigabytes(bytes) +
                                 ", and a .glb has room for 4: write .usda or .pc2, or fewer frames");
}

std::uint64_t ClipFile::expectedBytes() const {
    const std::uint64_t frames = motion_.frames.count();
    return frames * (bytesPerVertex * vertices_.count() + frames * sizeof(float)) +
           (vertices_.uvs.size() + vertices_.triangles.size()) * sizeof(float);
}

void ClipFile::add(int frame, std::span<const float> xyz) {
    numbers_.push_back(frame);
    frames_.push_back({{xyz.begin(), xyz.end()}, vertexNormals(xyz, polygons_)});
}

MorphClip ClipFile::clip() {
    MorphClip clip = clipOfMesh();
    if (vertices_.copies.empty())
        return clip;
    split(clip.base);
    for (ClipTarget& target : clip.targets)
        split(target.shape);
    return clip;
}

void ClipFile::split(ClipShape& shape) const {
    shape.points = vertices_.withCopies<float>(shape.points, 3);
    shape.normals = vertices_.withCopies<float>(shape.normals, 3);
}

MorphClip ClipFile::clipOfMesh() {
    if (!motion_.allowedError)
        return clipOfFrames(std::move(frames_), numbers_);
    const double millimetres = millimetresPerMeter * motion_.metersPerUnit;
    FittedClip fitted = fitClip(frames_, *motion_.allowedError / millimetres);
    shapes_ = {fitted.clip.targets.size(), fitted.error * millimetres};
    if (shapes_->error > *motion_.allowedError)
        throw std::runtime_error("all " + std::to_string(shapes_->count) + " shapes of the motion are up to " +
                                 numberText(shapes_->error) + " mm from it, by rounding alone, and --error is " +
                                 numberText(*motion_.allowedError) + ": take --targets frames");
    return std::move(fitted.clip);
}

void ClipFile::finish() {
    const int zero = std::min(motion_.frames.first, 1);
    std::vector<float> seconds;
    for (const int number : numbers_)
        seconds.push_back(static_cast<float>((number - zero) / motion_.framesPerSecond));
    try {
        writeClip(file_.stream(), clip(), vertices_, seconds, motion_);
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(path_.string() + " could not be written: " + error.what());
    }
    file_.finish();
}

} // namespace quarn
