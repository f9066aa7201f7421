// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/animations.h"

#include "quarn/character/morphTargets.h"
#include "quarn/character/uniqueNames.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

struct KeySource {
    double ticksPerSecond;
    std::string owner; ///< for errors
};

[[noreturn]] void refuse(const KeySource& source, const std::string& what) {
    throw std::runtime_error(source.owner + " " + what);
}

HVector valueOf(const aiVector3D& value, const KeySource& source) {
    if (!std::isfinite(value.x) || !std::isfinite(value.y) || !std::isfinite(value.z))
        refuse(source, "has a key that is not finite");
    return {static_cast<double>(value.x), static_cast<double>(value.y), static_cast<double>(value.z)};
}

HQuaternion valueOf(const aiQuaternion& value, const KeySource& source) {
    const HQuaternion q(static_cast<double>(value.x), static_cast<double>(value.y), static_cast<double>(value.z),
                        static_cast<double>(value.w));
    if (!std::isfinite(q.length()) || q.length() < 1e-6)
        refuse(source, "has a rotation key of length 0 or not finite");
    return q.normal();
}

template <class Value, class ImportedKey>
Track<Value> readTrack(const ImportedKey* keys, unsigned count, Interpolation interpolation, const KeySource& source) {
    Track<Value> track;
    track.interpolation = interpolation;
    track.keys.reserve(count);
    for (unsigned i = 0; i < count; ++i) {
        const double seconds = keys[i].mTime / source.ticksPerSecond;
        if (!std::isfinite(seconds) || (i > 0 && seconds < track.keys.back().seconds))
            refuse(source, "has keys that are not in the order of their times");
        track.keys.push_back({seconds, valueOf(keys[i].mValue, source)});
    }
    return track;
}

template <class Value>
double lastKey(const Track<Value>& track) {
    return track.keys.empty() ? 0.0 : track.keys.back().seconds;
}

class AnimationReader {
public:
    AnimationReader(const Skeleton& skeleton, const MeshIndices& meshes, const SourceHints& hints, Character& character)
        : skeleton_(skeleton)
        , meshes_(meshes)
        , hints_(hints)
        , character_(character) {}

    void read(const aiAnimation& imported, std::size_t index) {
        Animation animation;
        animation.name = names_.take(imported.mName.C_Str(), "animation");
        for (unsigned c = 0; c < imported.mNumChannels; ++c)
            readChannel(*imported.mChannels[c], imported.mTicksPerSecond, index, animation);
        for (const SourceMorphTrack& track : hints_.morphTracks)
            if (track.animation == index)
                readMorphs(track, animation);
        if (animation.channels.empty() && animation.morphs.empty()) {
            character_.warnings.push_back("the animation \"" + animation.name + "\" moves no joint and is left out");
            return;
        }
        character_.animations.push_back(std::move(animation));
    }

private:
    void readChannel(const aiNodeAnim& imported, double ticksPerSecond, std::size_t index, Animation& animation) {
        const std::string node = imported.mNodeName.C_Str();
        const std::string owner = "the animation \"" + animation.name + "\"";
        const auto joint = skeleton_.jointOf.find(node);
        if (joint == skeleton_.jointOf.end()) {
            character_.warnings.push_back(owner + " moves \"" + hints_.nodeName(node) +
                                          "\", which is not a joint; this is not read");
            return;
        }
        // where the file does not say, the importer's times are seconds
        const KeySource source{ticksPerSecond > 0.0 && std::isfinite(ticksPerSecond) ? ticksPerSecond : 1.0,
                               owner + " of \"" + hints_.nodeName(node) + "\""};
        const auto interpolation = [&](TrackKind kind) {
            return hints_.stepTracks.count({index, node, kind}) > 0 ? Interpolation::Step : Interpolation::Linear;
        };
        JointChannel channel;
        channel.joint = joint->second;
        channel.translation = readTrack<HVector>(imported.mPositionKeys, imported.mNumPositionKeys,
                                                 interpolation(TrackKind::Translation), source);
        channel.rotation = readTrack<HQuaternion>(imported.mRotationKeys, imported.mNumRotationKeys,
                                                  interpolation(TrackKind::Rotation), source);
        channel.scale = readTrack<HVector>(imported.mScalingKeys, imported.mNumScalingKeys,
                                           interpolation(TrackKind::Scale), source);
        animation.seconds = std::max(
            {animation.seconds, lastKey(channel.translation), lastKey(channel.rotation), lastKey(channel.scale)});
        animation.channels.push_back(std::move(channel));
    }

    void readMorphs(const SourceMorphTrack& track, Animation& animation) {
        const auto mesh = meshes_.find(track.node);
        if (mesh == meshes_.end())
            return; // of a mesh that is left out
        const std::vector<MorphTarget>& targets = character_.meshes[mesh->second].morphTargets;
        for (MorphChannel& channel :
             morphChannels(track, mesh->second, targets.size(),
                           "the animation \"" + animation.name + "\" of the morph targets of \"" +
                               character_.meshes[mesh->second].name + "\"")) {
            animation.seconds = std::max(animation.seconds, lastKey(channel.weight));
            animation.morphs.push_back(std::move(channel));
        }
    }

    const Skeleton& skeleton_;
    const MeshIndices& meshes_;
    const SourceHints& hints_;
    Character& character_;
    UniqueNames names_;
};

} // namespace

void readAnimations(const aiScene& scene, const Skeleton& skeleton, const MeshIndices& meshes, const SourceHints& hints,
                    Character& character) {
    AnimationReader reader(skeleton, meshes, hints, character);
    for (unsigned a = 0; a < scene.mNumAnimations; ++a)
        reader.read(*scene.mAnimations[a], a);
}

} // namespace quarn
