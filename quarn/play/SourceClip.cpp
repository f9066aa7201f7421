// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/SourceClip.h"

#include "quarn/console/numberText.h"
#include "quarn/play/GltfAmender.h"
#include "quarn/play/fitClip.h"
#include "quarn/play/fitInSkin.h"
#include "quarn/scene/plugs.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

constexpr double millimetresPerMeter = 1000.0;

} // namespace

SourceClip::SourceClip(const std::filesystem::path& path, MeshPolygons polygons, ClipMotion motion)
    : path_(path)
    , file_(path)
    , polygons_(std::move(polygons))
    , motion_(std::move(motion))
    , places_(motion_.source->joints.size())
    , morphs_(motion_.source->morphs.size()) {}

std::uint64_t SourceClip::expectedBytes() const {
    constexpr std::uint64_t bytesPerVertex = 6 * sizeof(float); // position and normal
    const std::uint64_t frames = motion_.frames.count();
    return motion_.source->file.binary.size() +
           frames * (bytesPerVertex * mesh().vertexCount() + frames * sizeof(float));
}

void SourceClip::add(int frame, std::span<const float> xyz) {
    const ClipSource& source = *motion_.source;
    numbers_.push_back(frame);
    results_.emplace_back(xyz.begin(), xyz.end());
    for (std::size_t joint = 0; joint < source.joints.size(); ++joint)
        places_[joint].push_back(matrixOf(source.joints[joint].world));
    for (std::size_t m = 0; m < source.morphs.size(); ++m) {
        std::vector<float>& weights = morphs_[m].emplace_back();
        for (const HPlug& weight : source.morphs[m].weights)
            weights.push_back(static_cast<float>(numberOf(weight)));
        // some readers clamp them; ours make up for it
        if (source.morphs[m].node == source.meshNode)
            for (float& weight : weights)
                weight = std::clamp(weight, 0.0F, 1.0F);
    }
}

// of the targets that the mesh has already; 0 where the scene has none
std::vector<float> SourceClip::knownWeights(std::size_t frame) const {
    std::vector<float> weights;
    for (std::size_t m = 0; m < morphs_.size(); ++m)
        if (motion_.source->morphs[m].node == motion_.source->meshNode)
            weights = morphs_[m][frame];
    weights.resize(mesh().targetCount());
    return weights;
}

FileFrame SourceClip::fileFrame(const JointTracks& joints, std::size_t frame) const {
    FileFrame file{mesh().morphed(knownWeights(frame)), mesh().blended(joints.worlds(frame))};
    if (!mesh().hasNormals())
        file.before.normals.clear();
    return file;
}

std::vector<ClipShape> SourceClip::deltas(const JointTracks& joints) {
    BeforeSkin before(motion_.source->sceneVertexOf, polygons_);
    std::vector<ClipShape> deltas;
    for (std::size_t frame = 0; frame < results_.size(); ++frame) {
        deltas.push_back(before.deltas(fileFrame(joints, frame), results_[frame]));
        results_[frame] = {};
    }
    tellOfStuck(before);
    return deltas;
}

void SourceClip::tellOfStuck(const BeforeSkin& before) {
    if (before.stuck().empty())
        return;
    constexpr std::size_t named = 5;
    std::string vertices;
    std::size_t count = 0;
    double farthest = 0.0;
    for (const auto& [vertex, stuck] : before.stuck()) {
        if (count++ < named)
            vertices += (vertices.empty() ? "" : ", ") + std::to_string(vertex) + " (in " +
                        std::to_string(stuck.frames) + (stuck.frames == 1 ? " frame)" : " frames)");
        farthest = std::max(farthest, stuck.farthest);
    }
    notes_.push_back(std::to_string(count) + (count == 1 ? " vertex" : " vertices") +
                     " of the file that the skin squeezes flat, or does not move, cannot be brought to the result, and "
                     "stay up to " +
                     numberText(farthest * millimetresPerMeter * motion_.metersPerUnit) + " mm from it: " + vertices +
                     (count > named ? " and others" : ""));
}

SourceClip::Added SourceClip::added(std::vector<ClipShape> deltas, const JointTracks& joints) {
    if (motion_.allowedError)
        return fitted(deltas, joints);
    Added added;
    added.weights.resize(deltas.size() * deltas.size());
    for (std::size_t frame = 0; frame < deltas.size(); ++frame) {
        added.targets.push_back({"frame " + std::to_string(numbers_[frame]), std::move(deltas[frame])});
        added.weights[frame * deltas.size() + frame] = 1.0F;
    }
    return added;
}

SourceClip::Added SourceClip::fitted(const std::vector<ClipShape>& deltas, const JointTracks& joints) {
    const double millimetres = millimetresPerMeter * motion_.metersPerUnit;
    const auto skin = [&](std::size_t frame) { return mesh().blended(joints.worlds(frame)); };
    FittedClip fit = fitInSkin(deltas, *motion_.allowedError / millimetres, skin);
    shapes_ = {fit.clip.targets.size() + 1, fit.error * millimetres};
    if (shapes_->error > *motion_.allowedError)
        throw std::runtime_error("all " + std::to_string(shapes_->count) + " shapes of the motion are up to " +
                                 numberText(shapes_->error) + " mm from it, by rounding alone, and --error is " +
                                 numberText(*motion_.allowedError) + ": take --targets frames");
    Added added;
    const std::size_t shapes = fit.clip.targets.size();
    // what is always there, as the base of the file stays what it is
    added.targets.push_back({"clip", std::move(fit.clip.base)});
    added.targets.insert(added.targets.end(), fit.clip.targets.begin(), fit.clip.targets.end());
    for (std::size_t frame = 0; frame < deltas.size(); ++frame) {
        added.weights.push_back(1.0F);
        const auto first = fit.clip.weights.begin() + static_cast<std::ptrdiff_t>(frame * shapes);
        added.weights.insert(added.weights.end(), first, first + static_cast<std::ptrdiff_t>(shapes));
    }
    return added;
}

// known ones first
std::vector<float> SourceClip::allWeights(const std::vector<float>& added) const {
    const std::size_t frames = numbers_.size();
    const std::size_t count = added.size() / frames;
    std::vector<float> all;
    for (std::size_t frame = 0; frame < frames; ++frame) {
        const std::vector<float> known = knownWeights(frame);
        all.insert(all.end(), known.begin(), known.end());
        const auto first = added.begin() + static_cast<std::ptrdiff_t>(frame * count);
        all.insert(all.end(), first, first + static_cast<std::ptrdiff_t>(count));
    }
    return all;
}

std::vector<float> SourceClip::seconds() const {
    const int zero = std::min(motion_.frames.first, 1);
    std::vector<float> seconds;
    for (const int number : numbers_)
        seconds.push_back(static_cast<float>((number - zero) / motion_.framesPerSecond));
    return seconds;
}

void SourceClip::write() {
    ClipSource& source = *motion_.source;
    std::vector<std::size_t> jointNodes;
    for (const ClipSource::JointNode& joint : source.joints)
        jointNodes.push_back(joint.node);
    const JointTracks joints(nodes(), jointNodes, places_);
    const Added clip = added(deltas(joints), joints);
    GltfAmender amender(source.file);
    amender.addTargets(source.meshNode, mesh().parts(), mesh().targetCount(), clip.targets);
    amender.beginAnimation("clip", seconds());
    for (const JointTrack& track : joints.tracks())
        amender.addTrack(nodes(), track);
    amender.addWeights(source.meshNode, allWeights(clip.weights));
    std::set<std::size_t> weighted{source.meshNode};
    for (std::size_t m = 0; m < morphs_.size(); ++m) {
        if (!weighted.insert(source.morphs[m].node).second)
            continue;
        std::vector<float> weights;
        for (const std::vector<float>& frame : morphs_[m])
            weights.insert(weights.end(), frame.begin(), frame.end());
        amender.addWeights(source.morphs[m].node, weights);
    }
    for (std::string& sentence : amender.endAnimation({jointNodes.begin(), jointNodes.end()}, weighted))
        notes_.push_back(std::move(sentence));
    amender.write(file_.stream());
}

void SourceClip::finish() {
    notes_ = motion_.source->file.notes;
    try {
        write();
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(path_.string() + " could not be written: " + error.what());
    }
    file_.finish();
}

} // namespace quarn
