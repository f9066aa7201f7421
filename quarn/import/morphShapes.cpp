// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/morphShapes.h"

#include "quarn/scene/plugs.h"

#include <algorithm>
#include <string>
#include <vector>

namespace quarn {
namespace {

void setShape(const HObject& shapes, const std::string& index, const MorphTarget& target, const HMatrix& toScene) {
    // an empty list of vertices would be all of them
    if (target.vertices.empty())
        return;
    std::vector<double> deltas;
    deltas.reserve(3 * target.deltas.size());
    for (const HVector& delta : target.deltas) {
        const HVector placed = delta * toScene;
        deltas.insert(deltas.end(), {placed.x, placed.y, placed.z});
    }
    const std::string shape = "shapes[0].shape" + index;
    setList(plugOf(shapes, shape + ".vertices"), std::vector<double>(target.vertices.begin(), target.vertices.end()));
    setList(plugOf(shapes, shape + ".deltas"), deltas);
}

void setSlider(const HObject& sliders, const std::string& index, const MorphTarget& target) {
    const std::string slider = "slider" + index;
    setText(plugOf(sliders, slider + ".sliderName"), target.name);
    setNumber(plugOf(sliders, slider + ".minValue"), std::min(0.0, target.restWeight));
    setNumber(plugOf(sliders, slider + ".maxValue"), std::max(1.0, target.restWeight));
    setNumber(plugOf(sliders, slider + ".defaultValue"), target.restWeight);
    setNumber(plugOf(sliders, slider + ".value"), target.restWeight);
}

} // namespace

MorphNodes makeMorphs(const CharacterMesh& mesh, const HObject& node, const HMatrix& toScene) {
    MorphNodes made;
    if (mesh.morphTargets.empty())
        return made;
    made.shapes = createNode("blendShape", nodeName(node) + "_shapes");
    made.sliders = createNode("sliders", nodeName(node) + "_sliders");
    connect(plugOf(node, "outMesh"), plugOf(made.shapes, "input[0].inputGeometry"));
    for (std::size_t t = 0; t < mesh.morphTargets.size(); ++t) {
        const std::string index = "[" + std::to_string(t) + "]";
        setShape(made.shapes, index, mesh.morphTargets[t], toScene);
        setSlider(made.sliders, index, mesh.morphTargets[t]);
        connect(plugOf(made.sliders, "output" + index), plugOf(made.shapes, "weight" + index));
    }
    return made;
}

} // namespace quarn
