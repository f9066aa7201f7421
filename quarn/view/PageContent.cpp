// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/PageContent.h"

#include "quarn/scene/plugs.h"

#include <algorithm>
#include <array>
#include <map>

namespace quarn {
namespace {

using Words = std::vector<std::uint32_t>;

std::uint32_t word(std::size_t count) {
    return static_cast<std::uint32_t>(count);
}

void addSettings(const PageContent& content, PageBlocks& blocks) {
    std::array<std::uint32_t, 16> settings{};
    settings[0] = 1;
    settings[1] = word(content.polygons.vertexCount);
    settings[2] = content.model.model->settings().deltaMode;
    settings[3] = static_cast<std::uint32_t>(content.model.model->settings().smoothingIterations);
    settings[4] = word(content.model.shapes);
    settings[5] = word(content.model.slots);
    settings[6] = word(content.model.model->controlCount());
    settings[7] = word(content.frames.count());
    settings[8] = content.chain ? 0 : 1;
    if (content.chain) {
        settings[9] = word(content.chain->influences.size());
        settings[12] = word(content.chain->shapes.size());
    }
    if (content.rig) {
        settings[10] = word(content.rig->joints.size());
        settings[11] = word(content.rig->sliders.size());
        settings[13] = word(content.rig->values.size());
        settings[14] = word(content.rig->converters.size());
    }
    blocks.add("settings", settings);
}

// a vertex is drawn once for each texture coordinate that it has
void addSplitVertices(const MeshPolygons& polygons, PageBlocks& blocks) {
    std::map<std::pair<std::uint32_t, std::uint32_t>, std::uint32_t> known;
    Words vertices, corners;
    std::vector<float> uvs;
    for (std::size_t i = 0; i < polygons.corners.size(); ++i) {
        const std::uint32_t uv = polygons.uvCorners[i];
        const auto [place, isNew] = known.emplace(std::pair(polygons.corners[i], uv), word(vertices.size()));
        corners.push_back(place->second);
        if (!isNew)
            continue;
        vertices.push_back(polygons.corners[i]);
        uvs.insert(uvs.end(), {polygons.uvs[2 * std::size_t{uv}], polygons.uvs[2 * std::size_t{uv} + 1]});
    }
    blocks.add("draw.vertices", vertices);
    blocks.add("draw.corners", corners);
    blocks.add("draw.uvs", uvs);
}

void addMesh(const PageContent& content, PageBlocks& blocks) {
    blocks.add("mesh.sizes", content.polygons.sizes);
    blocks.add("mesh.corners", content.polygons.corners);
    blocks.add("mesh.rest", content.rest);
    if (!content.textures.materials.empty() && !content.polygons.uvs.empty())
        addSplitVertices(content.polygons, blocks);
}

void addModel(const PageModel& model, PageBlocks& blocks) {
    blocks.addIfAny("model.vertices", model.vertices);
    blocks.add("network.words", model.network.words);
    blocks.add("network.constants", model.network.constants);
    if (model.shapes == 0)
        return;
    if (model.basis.kind == BasisKind::i16)
        blocks.add("basis.values", model.basis.shorts);
    else if (model.basis.kind == BasisKind::i8)
        blocks.add("basis.values", model.basis.bytes);
    else
        blocks.add("basis.values", model.basis.floats);
    blocks.addIfAny("basis.scales", model.basis.scales);
}

void addSkin(const PageContent& content, PageBlocks& blocks) {
    const rig::SkinWeights& skin = content.chain->skin;
    Words counts, influences;
    std::vector<double> weights;
    for (std::size_t vertex = 0; vertex < content.polygons.vertexCount; ++vertex)
        counts.push_back(vertex < skin.vertexCount() ? skin.first[vertex + 1] - skin.first[vertex] : 0);
    for (const rig::Influence& influence : skin.influences) {
        influences.push_back(influence.joint);
        weights.push_back(influence.weight);
    }
    blocks.add("skin.points", content.base);
    blocks.add("skin.counts", counts);
    blocks.add("skin.influences", influences);
    blocks.add("skin.weights", weights);
}

void addShapes(const std::vector<InputChain::Shape>& shapes, PageBlocks& blocks) {
    Words counts, vertices;
    std::vector<double> deltas;
    for (const InputChain::Shape& shape : shapes) {
        counts.push_back(word(shape.deltas.count()));
        vertices.insert(vertices.end(), shape.deltas.vertices.begin(), shape.deltas.vertices.end());
        deltas.insert(deltas.end(), shape.deltas.xyz.begin(), shape.deltas.xyz.end());
    }
    if (shapes.empty())
        return;
    blocks.add("shapes.counts", counts);
    blocks.add("shapes.vertices", vertices);
    blocks.add("shapes.deltas", deltas);
}

void append(std::vector<double>& numbers, const HMatrix& matrix) {
    for (unsigned i = 0; i < 16; ++i)
        numbers.push_back(matrix[i / 4][i % 4]);
}

void addJoints(const RigChain& rig, PageBlocks& blocks) {
    std::vector<std::int32_t> parents;
    Words orders;
    std::vector<double> channels, rests, spaces;
    for (const RigChain::Joint& joint : rig.joints) {
        parents.push_back(joint.parent);
        orders.push_back(static_cast<std::uint32_t>(wholeNumberOf(plugOf(joint.node, "rotateOrder"))));
        for (std::size_t channel = 0; channel < channelCount; ++channel)
            channels.push_back(numberOf(channelPlug(joint.node, channel)));
        append(rests, matrixOf(plugOf(joint.node, "restMatrix")));
        append(spaces, joint.parent < 0 ? matrixOf(plugOf(joint.node, "parentMatrix")) : HMatrix());
    }
    blocks.add("rig.parents", parents);
    blocks.add("rig.orders", orders);
    blocks.add("rig.channels", channels);
    blocks.add("rig.rest", rests);
    blocks.add("rig.space", spaces);
}

void append(Words& words, const RigPlace& place) {
    words.insert(words.end(), {place.joint, place.number});
}

void addSliders(const RigChain& rig, PageBlocks& blocks) {
    std::vector<double> values, limits;
    Words sliders;
    for (const HPlug& plug : rig.values)
        values.push_back(numberOf(plug));
    for (const RigChain::Slider& slider : rig.sliders) {
        append(sliders, slider.place);
        limits.insert(limits.end(), {slider.limits.least, slider.limits.most, slider.limits.rest});
    }
    blocks.add("rig.values", values);
    blocks.add("rig.sliders", sliders);
    blocks.add("rig.limits", limits);
}

void addControls(const RigChain& rig, PageBlocks& blocks) {
    Words controls, converters;
    for (const RigChain::Control& control : rig.controls)
        controls.insert(controls.end(),
                        {control.kind, control.source, control.number, control.matrix, control.converter});
    for (const auto& converter : rig.converters)
        converters.insert(converters.end(), converter.begin(), converter.end());
    blocks.add("rig.controls", controls);
    blocks.add("rig.constants", rig.constants);
    blocks.add("rig.converters", converters);
}

void addCombinations(const std::vector<InputChain::Shape>& shapes, PageBlocks& blocks) {
    Words counts, factors;
    std::vector<double> ramps;
    bool hasRamps = false;
    for (const InputChain::Shape& shape : shapes) {
        counts.push_back(word(shape.factors.size()));
        factors.insert(factors.end(), shape.factors.begin(), shape.factors.end());
        ramps.insert(ramps.end(), shape.ramps.begin(), shape.ramps.end());
        ramps.resize(3 * factors.size()); // zeros stand for none
        hasRamps = hasRamps || !shape.ramps.empty();
    }
    if (factors.empty())
        return;
    blocks.add("rig.factorCounts", counts);
    blocks.add("rig.factors", factors);
    if (hasRamps)
        blocks.add("rig.ramps", ramps);
}

void addRig(const PageContent& content, PageBlocks& blocks) {
    const RigChain& rig = *content.rig;
    std::vector<double> binds;
    for (const InputChain::Influence& influence : content.chain->influences)
        append(binds, rig.influenceJoints[binds.size() / 16] == RigPlace::noJoint
                          ? matrixOf(influence.bind) * matrixOf(influence.matrix) // all that there is of it
                          : matrixOf(influence.bind));
    blocks.add("skin.joints", rig.influenceJoints);
    blocks.add("skin.binds", binds);
    addJoints(rig, blocks);
    addSliders(rig, blocks);
    addControls(rig, blocks);
    blocks.add("rig.weights", rig.shapeValues);
    addCombinations(content.chain->shapes, blocks);
    Words animated;
    for (const RigChain::Animated& one : rig.animated)
        append(animated, one.place);
    blocks.addIfAny("rig.animated", animated);
    blocks.addIfAny("frames.animated", content.frames.animated);
    blocks.add("frames.sliders", content.frames.sliders);
}

void addFrames(const PageContent& content, PageBlocks& blocks) {
    const PageFrames& frames = content.frames;
    if (content.chain) {
        blocks.add("frames.matrices", frames.matrices);
        blocks.addIfAny("frames.weights", frames.weights);
    } else {
        blocks.add("frames.points", frames.input);
    }
    blocks.add("frames.controls", frames.controls);
    const bool isWhole =
        std::all_of(frames.envelope.begin(), frames.envelope.end(), [](float envelope) { return envelope == 1.0F; });
    if (!isWhole)
        blocks.add("frames.envelope", frames.envelope);
}

void addTarget(const PageTarget& target, PageBlocks& blocks) {
    if (target.kind == TargetKind::points) {
        blocks.add("target.points", target.points.numbers);
        blocks.add("target.box", target.points.box);
    }
    if (target.kind == TargetKind::errors) {
        blocks.add("errors.before", target.before);
        blocks.add("errors.after", target.after);
        blocks.add("errors.range", std::array<double, 1>{target.range});
    }
}

void addTextures(const PageTextures& textures, PageBlocks& blocks) {
    for (std::size_t i = 0; i < textures.textures.size(); ++i)
        blocks.add("texture." + std::to_string(i), std::as_bytes(std::span<const char>(textures.textures[i].bytes)));
}

} // namespace

PageBlocks blocksOf(const PageContent& content) {
    PageBlocks blocks;
    addSettings(content, blocks);
    addMesh(content, blocks);
    addModel(content.model, blocks);
    blocks.addIfAny("weights", content.weights);
    if (content.chain) {
        addSkin(content, blocks);
        addShapes(content.chain->shapes, blocks);
    }
    if (content.rig)
        addRig(content, blocks);
    addFrames(content, blocks);
    addTarget(content.target, blocks);
    blocks.addIfAny("check.frames", content.checks.frames);
    blocks.addIfAny("check.sums", content.checks.sums);
    blocks.add("scale", std::array<double, 1>{content.mmPerUnit});
    addTextures(content.textures, blocks);
    return blocks;
}

} // namespace quarn
