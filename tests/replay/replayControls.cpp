// SPDX-License-Identifier: Apache-2.0
// Cases of the control nodes, replayed in a scene of their own.
#include "compare.h"
#include "kinds.h"
#include "values.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HTransformationMatrix.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Session.h"
#include "plugin/controls/controlNodesPlugin.h"

#include <stdexcept>

namespace replay {
namespace {

void require(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

// A scene with one node.
class NodeScene {
public:
    explicit NodeScene(const char* type) {
        addControlNodes();
        HStatus status;
        node_.create(type, HString(), &status);
        require(status);
    }

    HPlug plug(const char* attribute) const {
        HStatus status;
        HPlug found = node_.findPlug(attribute, &status);
        require(status);
        return found;
    }

private:
    OpenQuarn::Session session_;
    HFnDependencyNode node_;
};

void removeElement(const HPlug& element) {
    HDGModifier modifier;
    require(modifier.removeMultiInstance(element, true));
    require(modifier.doIt());
}

// calls visit(element, value) for the members { "3": value } of a sparse array
template <class Visit>
void forEachElement(const HPlug& array, const Json& members, Visit&& visit) {
    if (!members.IsObject())
        throw std::runtime_error("a sparse array is not an object");
    for (const auto& member : members.GetObject())
        visit(array.elementByLogicalIndex(static_cast<unsigned>(std::stoul(member.name.GetString()))), member.value);
}

std::vector<HPlug> existingElements(const HPlug& array) {
    std::vector<unsigned> indices;
    require(array.getExistingArrayAttributeIndices(indices));
    std::vector<HPlug> elements;
    elements.reserve(indices.size());
    for (const unsigned index : indices)
        elements.push_back(array.elementByLogicalIndex(index));
    return elements;
}

// the elements 0 ... n-1 of an output, evaluated
std::vector<double> outputValues(const HPlug& array) {
    require(OpenQuarn::evaluate(array));
    std::vector<double> values;
    for (const HPlug& element : existingElements(array)) {
        if (element.logicalIndex() != values.size())
            throw std::runtime_error(element.name().asStdString() + " follows a gap");
        values.push_back(element.asDouble());
    }
    return values;
}

// the arrays below the elements of an output, by index
Json outputLists(const HPlug& list, JsonAllocator& allocator) {
    require(OpenQuarn::evaluate(list));
    Json object(rapidjson::kObjectType);
    for (const HPlug& element : existingElements(list)) {
        Json key = toJson(std::to_string(element.logicalIndex()), allocator);
        object.AddMember(key, toJson(outputValues(element.child(0)), allocator), allocator);
    }
    return object;
}

HMatrix readHostMatrix(const Json& rows) {
    if (!rows.IsArray() || rows.Size() != 4)
        throw std::runtime_error("a matrix is not a list of four rows");
    HMatrix matrix;
    for (unsigned row = 0; row < 4; ++row) {
        if (!rows[row].IsArray() || rows[row].Size() != 4)
            throw std::runtime_error("a row of a matrix is not a list of four numbers");
        for (unsigned column = 0; column < 4; ++column)
            matrix(row, column) = readNumber(rows[row][column]);
    }
    return matrix;
}

void setMatrices(const HPlug& array, const Json& matrices) {
    forEachElement(array, matrices,
                   [](HPlug element, const Json& rows) { require(element.setMatrix(readHostMatrix(rows))); });
}

void setCollected(const HPlug& element, const Json& values) {
    const HPlug list = element.child(0);
    require(list.elementByLogicalIndex(0).setDouble(0.0)); // so that the list exists, even when it is empty
    removeElement(list.elementByLogicalIndex(0));
    forEachElement(list, values, [](HPlug value, const Json& number) { require(value.setDouble(readNumber(number))); });
}

Json decomposed(const Json& rows, JsonAllocator& allocator) {
    const HTransformationMatrix transformation(readHostMatrix(rows));
    const HEulerRotation euler = transformation.eulerRotation();
    const HVector translation = transformation.translation(HSpace::kTransform);
    double scale[3] = {};
    require(transformation.getScale(scale, HSpace::kTransform));
    Output out(allocator);
    out.set("euler", std::vector<double>{euler.x, euler.y, euler.z});
    out.set("scale", std::vector<double>{scale[0], scale[1], scale[2]});
    out.set("translation", std::vector<double>{translation.x, translation.y, translation.z});
    return out.take();
}

// the case says which decomposition its values are of
void checkDecomposition(const Json& expected, const Json& matrices, JsonAllocator& allocator) {
    constexpr double tolerance = 1e-12;
    Json actual(rapidjson::kObjectType);
    for (const auto& member : matrices.GetObject())
        actual.AddMember(Json(member.name, allocator), decomposed(member.value, allocator), allocator);
    const auto disagreements = compare(expected, actual, tolerance);
    if (!disagreements.empty())
        throw std::runtime_error("the host decomposes otherwise: " + disagreements[0].where + " is " +
                                 disagreements[0].actual + " instead of " + disagreements[0].expected);
}

} // namespace

Json replayCollector(Input& input, JsonAllocator& allocator) {
    const NodeScene scene("controlCollector");
    const HPlug lists = scene.plug("inputList");
    const HPlug output = scene.plug("output");
    unsigned index = 0;
    for (const Json& value : input["previous"].GetArray())
        require(lists.elementByLogicalIndex(0).child(0).elementByLogicalIndex(index++).setDouble(readNumber(value)));
    outputValues(output);
    removeElement(lists.elementByLogicalIndex(0));
    forEachElement(lists, input["inputList"], setCollected);
    return toJson(outputValues(output), allocator);
}

Json replayConverter(Input& input, JsonAllocator& allocator) {
    const Json& matrices = input["matrices"];
    const NodeScene scene("matrixConverter");
    setMatrices(scene.plug("input"), matrices);
    checkDecomposition(input["decomposition"], matrices, allocator);
    for (const auto& member : input["switches"].GetObject())
        require(scene.plug(member.name.GetString()).setBool(readBool(member.value)));
    require(scene.plug("rotationConversion").setShort(static_cast<short>(readCount(input["conversion"]))));
    Output out(allocator);
    out.set("flatOutput", outputValues(scene.plug("flatOutput")));
    out.set("outputList", outputLists(scene.plug("outputList"), allocator));
    return out.take();
}

Json replayOrtho(Input& input, JsonAllocator& allocator) {
    const NodeScene scene("orthoAxisFromMatrixArray");
    setMatrices(scene.plug("input"), input["input"]);
    return outputLists(scene.plug("outputList"), allocator);
}

} // namespace replay
