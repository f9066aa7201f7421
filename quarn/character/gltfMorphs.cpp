// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/gltfMorphs.h"

#include "quarn/character/gltfValues.h"

#include <utility>

namespace quarn {
namespace {

// writers agree on this place for names
std::string targetName(const JsonValue& mesh, rapidjson::SizeType target) {
    const JsonValue* extras = member(mesh, "extras");
    const JsonValue* names = extras == nullptr ? nullptr : member(*extras, "targetNames");
    const bool isThere = names != nullptr && names->IsArray() && target < names->Size() && (*names)[target].IsString();
    return isThere ? textOf((*names)[target]) : std::string();
}

std::vector<SourceTarget> targetsOf(const JsonValue& document, const JsonValue& mesh, GltfBytes& bytes) {
    std::vector<SourceTarget> targets;
    const JsonValue& parts = listOf(mesh, "primitives");
    const rapidjson::SizeType count = parts.Empty() ? 0 : listOf(parts[0], "targets").Size();
    for (rapidjson::SizeType t = 0; t < count; ++t) {
        SourceTarget& target = targets.emplace_back();
        target.name = targetName(mesh, t);
        for (const JsonValue& part : parts.GetArray()) {
            const JsonValue* positions = member(listOf(part, "targets")[t], "POSITION");
            target.deltas.push_back(positions == nullptr ? std::vector<float>()
                                                         : floatValues(document, positions->GetUint(), bytes));
        }
    }
    return targets;
}

// what a list of numbers has; 0 for what it has not
std::vector<double> weightsOf(const JsonValue* list, std::size_t count, const std::string& owner) {
    std::vector<double> weights(count, 0.0);
    if (list == nullptr)
        return weights;
    if (!list->IsArray() || list->Size() != count)
        throw std::runtime_error(owner + " has other weights than its " + std::to_string(count) + " morph targets");
    for (rapidjson::SizeType i = 0; i < list->Size(); ++i) {
        if (!(*list)[i].IsNumber())
            throw std::runtime_error(owner + " has a weight that is no number");
        weights[i] = (*list)[i].GetDouble();
    }
    return weights;
}

void readNode(const JsonValue& document, std::size_t index, GltfBytes& bytes, SourceHints& hints) {
    const JsonValue& node = listOf(document, "nodes")[static_cast<rapidjson::SizeType>(index)];
    const JsonValue* shown = member(node, "mesh");
    if (shown == nullptr || hints.targets.count(shown->GetUint()) == 0)
        return;
    const std::size_t mesh = shown->GetUint();
    bytes.charge(hints.targets.at(mesh).size() * sizeof(double));
    const JsonValue* own = member(node, "weights");
    const JsonValue* common = member(listOf(document, "meshes")[shown->GetUint()], "weights");
    hints.morphs[nodeId(index)] = {mesh, weightsOf(own != nullptr ? own : common, hints.targets.at(mesh).size(),
                                                   own != nullptr ? element("nodes", index) : element("meshes", mesh))};
}

// of each key of a cubic spline the tangent before it, its values, the tangent after it
std::vector<float> middleThirds(const std::vector<float>& values, std::size_t targets) {
    std::vector<float> middle;
    for (std::size_t key = 0; key < values.size() / targets; key += 3) {
        const auto first = values.begin() + static_cast<std::ptrdiff_t>((key + 1) * targets);
        middle.insert(middle.end(), first, first + static_cast<std::ptrdiff_t>(targets));
    }
    return middle;
}

void readChannel(const JsonValue& document, const JsonValue& animation, const JsonValue& channel, std::size_t index,
                 GltfBytes& bytes, SourceHints& hints) {
    const JsonValue& target = *member(channel, "target");
    const JsonValue* node = member(target, "node");
    if (node == nullptr || textOf(target, "path") != "weights")
        return;
    const auto morphs = hints.morphs.find(nodeId(node->GetUint()));
    if (morphs == hints.morphs.end()) {
        hints.warnings.push_back(element("animations", index) + " has weights for " +
                                 element("nodes", node->GetUint()) + ", which has no morph targets; this is not read");
        return;
    }
    const JsonValue& sampler = listOf(animation, "samplers")[member(channel, "sampler")->GetUint()];
    const std::string interpolation = textOf(sampler, "interpolation");
    SourceMorphTrack track{index, morphs->first, interpolation == "STEP",
                           floatValues(document, member(sampler, "input")->GetUint(), bytes),
                           floatValues(document, member(sampler, "output")->GetUint(), bytes)};
    if (interpolation == "CUBICSPLINE") {
        track.weights = middleThirds(track.weights, morphs->second.weights.size());
        hints.warnings.push_back(element("animations", index) +
                                 " has cubic splines of weights: their keys are read, and straight lines between them");
    }
    hints.morphTracks.push_back(std::move(track));
}

} // namespace

void readMorphs(const JsonValue& document, GltfBytes& bytes, SourceHints& hints) {
    const JsonValue& meshes = listOf(document, "meshes");
    for (rapidjson::SizeType mesh = 0; mesh < meshes.Size(); ++mesh)
        if (auto targets = targetsOf(document, meshes[mesh], bytes); !targets.empty())
            hints.targets.emplace(mesh, std::move(targets));
    for (std::size_t node = 0; node < listOf(document, "nodes").Size(); ++node)
        readNode(document, node, bytes, hints);
    std::size_t index = 0;
    for (const JsonValue& animation : listOf(document, "animations").GetArray()) {
        for (const JsonValue& channel : listOf(animation, "channels").GetArray())
            readChannel(document, animation, channel, index, bytes, hints);
        ++index;
    }
}

} // namespace quarn
