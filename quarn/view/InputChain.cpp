// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/InputChain.h"

#include "openquarn/HFnData.h"
#include "quarn/console/numberText.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/shapes.h"
#include "quarn/view/NotInPage.h"
#include "rig/combinedWeight.h"

#include <algorithm>
#include <map>
#include <set>

namespace quarn {
namespace {

std::string element(const char* array, std::size_t index) {
    return std::string(array) + "[" + std::to_string(index) + "]";
}

bool has(const HObject& node, const std::string& array, unsigned index) {
    const std::vector<unsigned> indices = indicesOf(plugOf(node, array));
    return std::find(indices.begin(), indices.end(), index) != indices.end();
}

std::vector<double> listOf(const HObject& node, const std::string& path) {
    return HFnDoubleArrayData(plugOf(node, path).asHObject()).values();
}

HPlug inputOf(const HObject& node, unsigned geometry) {
    const HPlug input = plugOf(node, element("input", geometry) + ".inputGeometry");
    const HPlug source = input.source();
    return source.isNull() ? input : source;
}

void requireWhole(const HObject& node, unsigned geometry) {
    if (const std::string why = whyNotWhole(node, geometry); !why.empty())
        throw NotInPage(why);
}

// what comes into the skin that gives out this plug
HPlug takeSkin(const HPlug& output, const std::vector<SceneJoint>& joints, InputChain& chain) {
    const HObject node = output.node();
    const unsigned geometry = output.logicalIndex();
    requireWhole(node, geometry);
    const HPlug input = plugOf(node, element("input", geometry) + ".inputGeometry");
    for (SceneSkin& skin : sceneSkins(joints)) {
        if (skin.input != input)
            continue;
        for (std::size_t i = 0; i < skin.influences.size(); ++i) {
            const std::uint32_t index = skin.weights.joints[i];
            chain.influences.push_back({plugOf(node, element("matrix", index)),
                                        plugOf(node, element("bindPreMatrix", index)),
                                        skin.influences[i].joint.value_or(InputChain::Influence::none)});
        }
        chain.skin = std::move(skin.weights);
    }
    return inputOf(node, geometry);
}

// the indices of all weights, given and combined
std::vector<unsigned> weightsOf(const HObject& node) {
    const std::vector<unsigned> given = indicesOf(plugOf(node, "weight"));
    std::set<unsigned> all(given.begin(), given.end());
    for (const unsigned index : indicesOf(plugOf(node, "combination")))
        if (!listOf(node, element("combination", index) + ".factors").empty())
            all.insert(index);
    return {all.begin(), all.end()};
}

void readCombination(const HObject& node, const std::map<unsigned, std::uint32_t>& places, InputChain::Shape& shape) {
    const std::string path = element("combination", shape.index);
    for (const double factor : listOf(node, path + ".factors")) {
        const auto place =
            factor >= 0.0 && factor < 4294967296.0 ? places.find(static_cast<unsigned>(factor)) : places.end();
        if (place == places.end() || static_cast<double>(place->first) != factor)
            throw NotInPage(nodeName(node) + "." + path + " has the factor " + numberText(factor) +
                            ", which is no weight");
        shape.factors.push_back(place->second);
    }
    shape.ramps = listOf(node, path + ".ramps");
}

// what comes into the blend shapes that give out this plug
HPlug takeShapes(const HPlug& output, InputChain& chain) {
    const HObject node = output.node();
    const unsigned geometry = output.logicalIndex();
    requireWhole(node, geometry);
    HPlug input = inputOf(node, geometry);
    const std::size_t vertices = vertexCountOf(input);
    std::map<unsigned, std::uint32_t> places;
    for (const unsigned index : weightsOf(node))
        places.emplace(index, static_cast<std::uint32_t>(places.size()));
    for (const auto& [index, place] : places) {
        InputChain::Shape& shape = chain.shapes.emplace_back();
        shape.index = index;
        shape.deltas = shapeDeltas(node, geometry, index, vertices);
        if (has(node, "combination", index))
            readCombination(node, places, shape);
        if (shape.factors.empty())
            shape.weight = plugOf(node, element("weight", index));
    }
    return input;
}

} // namespace

InputChain inputChain(const WarpGeometry& geometry, const std::vector<SceneJoint>& joints) {
    InputChain chain;
    HPlug place = geometry.input;
    const auto isOf = [&](const char* type) { return place.isElement() && nodeType(place.node()) == type; };
    if (isOf("skinCluster"))
        place = takeSkin(place, joints, chain);
    if (isOf("blendShape"))
        place = takeShapes(place, chain);
    const std::string type = nodeType(place.node());
    if (type != "mesh" && type != "polyGrid")
        throw NotInPage(std::string(place.name().asChar()) + " is of a node of type " + type +
                        ", and a page computes blend shapes and then a skin");
    chain.base = place;
    return chain;
}

std::string whyNotWhole(const HObject& deformer, unsigned geometry) {
    const HPlug envelope = plugOf(deformer, "envelope");
    const std::string name = nodeName(deformer);
    if (!envelope.source().isNull())
        return std::string(envelope.source().name().asChar()) + " is connected into " + name + ".envelope";
    if (const double value = numberOf(envelope); value != 1.0)
        return name + ".envelope is " + numberText(value);
    const std::string part = textOf(plugOf(deformer, element("input", geometry) + ".componentTagExpression"));
    if (!part.empty() && part != "*")
        return name + " deforms only the component " + part;
    const std::vector<double> weights = has(deformer, "weightList", geometry)
                                            ? numbersOf(plugOf(deformer, element("weightList", geometry) + ".weights"))
                                            : std::vector<double>();
    if (std::any_of(weights.begin(), weights.end(), [](double weight) { return weight != 1.0; }))
        return name + "." + element("weightList", geometry) + " has weights of points";
    return {};
}

std::vector<float> pointWeights(const HObject& deformer, unsigned geometry, std::size_t vertices) {
    if (!has(deformer, "weightList", geometry))
        return {};
    const HPlug list = plugOf(deformer, element("weightList", geometry) + ".weights");
    std::vector<float> weights(vertices, 1.0F);
    for (const unsigned vertex : indicesOf(list))
        if (vertex < vertices)
            weights[vertex] = static_cast<float>(numberOf(list.elementByLogicalIndex(vertex)));
    const bool isWhole = std::all_of(weights.begin(), weights.end(), [](float weight) { return weight == 1.0F; });
    return isWhole ? std::vector<float>() : weights;
}

std::vector<double> shapeWeights(const std::vector<InputChain::Shape>& shapes) {
    std::vector<double> weights(shapes.size(), 0.0);
    std::vector<rig::ShapeWeight> given;
    for (std::size_t i = 0; i < shapes.size(); ++i) {
        if (!shapes[i].factors.empty())
            continue;
        weights[i] = numberOf(shapes[i].weight);
        given.push_back({static_cast<std::uint32_t>(i), weights[i]});
    }
    for (std::size_t i = 0; i < shapes.size(); ++i) {
        if (shapes[i].factors.empty())
            continue;
        const std::vector<double> factors(shapes[i].factors.begin(), shapes[i].factors.end());
        if (const HStatus status = rig::combineWeight({factors, shapes[i].ramps}, given, weights[i]); status.error())
            throw std::runtime_error("combination[" + std::to_string(shapes[i].index) +
                                     "]: " + status.errorString().asChar());
    }
    return weights;
}

} // namespace quarn
