// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/morphTargets.h"

#include "quarn/character/uniqueNames.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

[[noreturn]] void refuse(const CharacterMesh& mesh, const MorphTarget& target, const std::string& what) {
    throw std::runtime_error("the mesh \"" + mesh.name + "\" has a morph target \"" + target.name + "\" with " + what);
}

bool fits(const std::vector<SourceTarget>& targets, const std::vector<std::uint32_t>& partSizes) {
    for (const SourceTarget& target : targets) {
        if (target.deltas.size() != partSizes.size())
            return false;
        for (std::size_t part = 0; part < partSizes.size(); ++part)
            if (!target.deltas[part].empty() && target.deltas[part].size() != 3 * std::size_t{partSizes[part]})
                return false;
    }
    return true;
}

void appendDeltas(const std::vector<float>& xyz, std::uint32_t firstPoint, const CharacterMesh& mesh,
                  MorphTarget& target) {
    for (std::size_t i = 0; i < xyz.size() / 3; ++i) {
        const HVector delta(static_cast<double>(xyz[3 * i]), static_cast<double>(xyz[3 * i + 1]),
                            static_cast<double>(xyz[3 * i + 2]));
        if (!std::isfinite(delta.x) || !std::isfinite(delta.y) || !std::isfinite(delta.z))
            refuse(mesh, target, "a delta that is not finite at vertex " + std::to_string(firstPoint + i));
        if (delta == HVector(0.0, 0.0, 0.0))
            continue;
        target.vertices.push_back(firstPoint + static_cast<std::uint32_t>(i));
        target.deltas.push_back(delta);
    }
}

} // namespace

void addMorphTargets(const SourceHints& hints, const std::string& node, const std::vector<std::uint32_t>& partSizes,
                     CharacterMesh& mesh, std::vector<std::string>& warnings) {
    const auto morphs = hints.morphs.find(node);
    if (morphs == hints.morphs.end())
        return;
    const std::vector<SourceTarget>& sources = hints.targets.at(morphs->second.mesh);
    if (!fits(sources, partSizes)) {
        warnings.push_back("the mesh \"" + mesh.name +
                           "\" has morph targets, which are not read: the importer has made other vertices of it");
        return;
    }
    UniqueNames names;
    for (std::size_t t = 0; t < sources.size(); ++t) {
        MorphTarget target;
        target.name = names.take(sources[t].name, "target" + std::to_string(t));
        target.restWeight = morphs->second.weights[t];
        if (!std::isfinite(target.restWeight))
            refuse(mesh, target, "a weight that is not finite");
        std::uint32_t firstPoint = 0;
        for (std::size_t part = 0; part < partSizes.size(); firstPoint += partSizes[part++])
            appendDeltas(sources[t].deltas[part], firstPoint, mesh, target);
        mesh.morphTargets.push_back(std::move(target));
    }
}

std::vector<MorphChannel> morphChannels(const SourceMorphTrack& track, std::uint32_t mesh, std::size_t targets,
                                        const std::string& owner) {
    std::vector<MorphChannel> channels(targets);
    for (std::size_t t = 0; t < targets; ++t) {
        channels[t].mesh = mesh;
        channels[t].target = static_cast<std::uint32_t>(t);
        channels[t].weight.interpolation = track.isStep ? Interpolation::Step : Interpolation::Linear;
        channels[t].weight.keys.reserve(track.seconds.size());
    }
    for (std::size_t key = 0; key < track.seconds.size(); ++key) {
        const auto seconds = static_cast<double>(track.seconds[key]);
        if (!std::isfinite(seconds) || (key > 0 && track.seconds[key] < track.seconds[key - 1]))
            throw std::runtime_error(owner + " has keys that are not in the order of their times");
        for (std::size_t t = 0; t < targets; ++t) {
            const auto weight = static_cast<double>(track.weights[key * targets + t]);
            if (!std::isfinite(weight))
                throw std::runtime_error(owner + " has a key that is not finite");
            channels[t].weight.keys.push_back({seconds, weight});
        }
    }
    return channels;
}

} // namespace quarn
