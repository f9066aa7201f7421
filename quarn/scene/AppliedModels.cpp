// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/AppliedModels.h"

#include "quarn/console/Log.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/modelFiles.h"
#include "quarn/scene/plugs.h"

#include "openquarn/HFnDependencyNode.h"

#include <algorithm>
#include <charconv>
#include <filesystem>
#include <set>
#include <stdexcept>
#include <string_view>
#include <utility>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr long long none = -1;

// "input[3].inputGeometry": 3; none where the attribute at the top is no array
long long elementOf(const HPlug& plug) {
    const std::string name = plug.partialName().asChar();
    const std::size_t open = name.find('[');
    long long index = none;
    if (open != std::string::npos && open < name.find('.'))
        std::from_chars(name.data() + open + 1, name.data() + name.size(), index);
    return index;
}

// node and, for a deformer, which of its geometries
using Place = std::pair<std::string, long long>;

// Walks upwards from plugs, and notes the geometries of deformers on the way.
class Walk {
public:
    void from(const HPlug& plug) {
        if (!plug.isNull())
            open_.push_back(plug);
        while (!open_.empty()) {
            const HPlug next = open_.back();
            open_.pop_back();
            visit(next);
        }
    }
    const std::vector<Place>& geometries() const { return geometries_; }

private:
    void visit(const HPlug& output) {
        const HObject node = output.node();
        const bool isDeformer = nodeType(node) == "neuralWarp";
        const Place place{nodeName(node), isDeformer ? elementOf(output) : none};
        if (!visited_.insert(place).second)
            return;
        if (isDeformer)
            geometries_.push_back(place);
        HPlugArray plugs;
        if (HFnDependencyNode(node).getConnections(plugs).error())
            return;
        for (const HPlug& input : plugs)
            if (const HPlug source = input.source(); !source.isNull() && (!isDeformer || matters(input, place.second)))
                open_.push_back(source);
    }
    // a geometry does not depend on what is connected for another one; targets of the training are for nobody here
    static bool matters(const HPlug& input, long long index) {
        const std::string name = input.partialName().asChar();
        if (name.starts_with("targetGeometry") || name.starts_with("poseGenerator"))
            return false;
        return name.starts_with("controlValues") || elementOf(input) == none || elementOf(input) == index;
    }

    std::vector<HPlug> open_;
    std::set<Place> visited_;
    std::vector<Place> geometries_;
};

// the plugs that switch a model on and off
std::vector<HPlug> switchesOf(const Warp& warp, const WarpGeometry& geometry) {
    return {warp.plug("models", geometry, "modelActive"), warp.plug("envelope"), warp.plug("targetMorphEnabled"),
            warp.plug("targetMorphEnvelope")};
}

std::string joined(const std::vector<std::string>& sentences) {
    std::string text;
    for (const std::string& sentence : sentences)
        text += (text.empty() ? "" : "; ") + sentence;
    return text;
}

void requireSoundFiles(const Warp& warp, const WarpGeometry& geometry) {
    const fs::path directory = modelDirectory(warp, geometry);
    if (!fs::is_directory(directory))
        return; // the deformer has something to say about that itself
    std::vector<std::string> problems;
    neuralWarp::ModelMetadata metadata;
    readMetadata(directory, metadata, problems);
    readShapeSizes(directory, problems);
    if (!problems.empty())
        throw std::runtime_error(warp.name + " cannot apply the model " + directory.string() + ": " + joined(problems));
}

void requireFittingRest(const Warp& warp, const WarpGeometry& geometry) {
    const std::size_t rest = vertexCountOf(geometry.original);
    const std::size_t deformed = vertexCountOf(geometry.input);
    if (rest != 0 && rest != deformed)
        throw std::runtime_error(warp.name + " cannot apply its model to " + geometry.name + ", which has " +
                                 std::to_string(deformed) + " vertices: its rest mesh " +
                                 geometry.original.name().asChar() + " has " + std::to_string(rest));
}

} // namespace

AppliedModels::AppliedModels(const std::vector<HPlug>& meshes) {
    Walk walk;
    for (const HPlug& mesh : meshes)
        walk.from(mesh);
    for (const auto& [node, index] : walk.geometries()) {
        Warp warp = Warp::find(node);
        const auto at = std::find_if(warp.geometries.begin(), warp.geometries.end(),
                                     [i = index](const WarpGeometry& geometry) { return geometry.index == i; });
        if (at != warp.geometries.end()) {
            WarpGeometry geometry = *at;
            geometries_.push_back({std::move(warp), std::move(geometry)});
        }
    }
    unchecked_ = geometries_;
}

void AppliedModels::requireSound() {
    std::erase_if(unchecked_, [this](const Geometry& one) {
        if (!isApplied(one))
            return !isGuarded_ && !canChange(one);
        requireSound(one);
        return true;
    });
}

bool AppliedModels::isApplied(const Geometry& one) {
    const auto& [warp, geometry] = one;
    const bool isReplaced =
        wholeNumberOf(warp.plug("targetMorphEnabled")) != 0 && numberOf(warp.plug("targetMorphEnvelope")) == 1.0;
    return isModelActive(warp, geometry) && numberOf(warp.plug("envelope")) != 0.0 && !isReplaced;
}

bool AppliedModels::canChange(const Geometry& one) {
    const std::vector<HPlug> plugs = switchesOf(one.warp, one.geometry);
    return std::any_of(plugs.begin(), plugs.end(), [](const HPlug& plug) { return !plug.source().isNull(); });
}

void AppliedModels::requireSound(const Geometry& one) {
    const Stage stage([&] {
        return one.warp.name + " applies the model " + modelDirectory(one.warp, one.geometry).string() + " to " +
               one.geometry.name + ": looking at its files";
    });
    requireSoundFiles(one.warp, one.geometry);
    requireFittingRest(one.warp, one.geometry);
}

} // namespace quarn
