// SPDX-License-Identifier: Apache-2.0
#include "geometry/filterAttributes.h"

#include "geometry/GeometryFilterState.h"
#include "openquarn/HPxDeformerNode.h"
#include "types/baseNodes.h"

namespace OpenQuarn {
namespace {

std::shared_ptr<Attribute> meshAttribute(const char* name, const char* shortName) {
    std::shared_ptr<Attribute> made = makeAttribute(HFn::kTypedAttribute, name, shortName);
    made->data = HFnData::kMesh;
    return made;
}

std::shared_ptr<Attribute> textAttribute(const char* name, const char* shortName, const char* text) {
    std::shared_ptr<Attribute> made = makeAttribute(HFn::kTypedAttribute, name, shortName);
    made->data = HFnData::kString;
    made->defaultData = std::make_shared<StringData>(text);
    return made;
}

std::shared_ptr<Attribute> factorAttribute(const char* name, const char* shortName) {
    std::shared_ptr<Attribute> made = makeAttribute(HFn::kNumericAttribute, name, shortName);
    made->number = HFnNumericData::kFloat;
    made->defaultNumber = 1.0;
    made->keyable = true;
    return made;
}

std::shared_ptr<Attribute> array(std::shared_ptr<Attribute> attribute) {
    attribute->array = true;
    return attribute;
}

std::shared_ptr<Attribute> output(std::shared_ptr<Attribute> attribute) {
    attribute->writable = false;
    attribute->storable = false;
    return attribute;
}

std::shared_ptr<Attribute> compound(const char* name, const char* shortName,
                                    const std::vector<std::shared_ptr<Attribute>>& children) {
    std::shared_ptr<Attribute> made = makeAttribute(HFn::kCompoundAttribute, name, shortName);
    made->children = children;
    for (const std::shared_ptr<Attribute>& child : children)
        child->parent = made;
    return made;
}

FilterAttributes makeFilterAttributes() {
    FilterAttributes made;
    made.inputGeometry = meshAttribute("inputGeometry", "ing");
    made.componentTagExpression = textAttribute("componentTagExpression", "cte", "*");
    made.input = array(compound("input", "inp", {made.inputGeometry, made.componentTagExpression}));
    made.originalGeometry = array(meshAttribute("originalGeometry", "org"));
    made.outputGeom = array(output(meshAttribute("outputGeom", "outg")));
    made.envelope = factorAttribute("envelope", "env");
    made.weights = array(factorAttribute("weights", "wts"));
    made.weightList = array(compound("weightList", "wtl", {made.weights}));
    return made;
}

/// Brings its input to its output as it is.
class MeshNode final : public HPxNode {
public:
    static HPxNode* creator() { return new MeshNode; }

    static const std::shared_ptr<Attribute>& inMesh() {
        static const std::shared_ptr<Attribute> attribute = meshAttribute("inMesh", "inm");
        return attribute;
    }
    static const std::shared_ptr<Attribute>& outMesh() {
        static const std::shared_ptr<Attribute> attribute = output(meshAttribute("outMesh", "outm"));
        return attribute;
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (!(plug == Access::object(outMesh())))
            return HStatus::kUnknownParameter;
        return block.outputValue(plug).set(block.inputValue(Access::object(inMesh())).data());
    }
};

} // namespace

const FilterAttributes& filterAttributes() {
    static const FilterAttributes attributes = makeFilterAttributes();
    return attributes;
}

std::shared_ptr<const NodeClass> geometryFilterClass() {
    static const std::shared_ptr<const NodeClass> type = [] {
        const FilterAttributes& own = filterAttributes();
        auto made = std::make_shared<NodeClass>("geometryFilter", HTypeId(0x4f510010), HFn::kGeometryFilter, nullptr);
        made->inherit(*dependClass());
        made->makeFilterState = makeGeometryFilterState;
        for (const auto& attribute : {own.input, own.originalGeometry, own.outputGeom, own.envelope})
            made->add(attribute);
        for (const auto& attribute : {own.input, own.inputGeometry, own.componentTagExpression, own.originalGeometry})
            made->affects(*attribute, *own.outputGeom, false, true);
        made->affects(*own.envelope, *own.outputGeom, false);
        made->finish();
        return made;
    }();
    return type;
}

std::shared_ptr<const NodeClass> deformerClass() {
    static const std::shared_ptr<const NodeClass> type = [] {
        const FilterAttributes& own = filterAttributes();
        auto made = std::make_shared<NodeClass>("deformer", HTypeId(0x4f510011), HFn::kGeometryFilter, nullptr);
        made->inherit(*geometryFilterClass());
        made->add(own.weightList);
        for (const auto& attribute : {own.weightList, own.weights})
            made->affects(*attribute, *own.outputGeom, false, true);
        made->finish();
        return made;
    }();
    return type;
}

std::shared_ptr<const NodeClass> meshClass() {
    static const std::shared_ptr<const NodeClass> type = [] {
        auto made = std::make_shared<NodeClass>("mesh", HTypeId(0x4f510012), HFn::kMeshNode, MeshNode::creator);
        made->inherit(*dependClass());
        made->add(MeshNode::inMesh());
        made->add(MeshNode::outMesh());
        made->affects(*MeshNode::inMesh(), *MeshNode::outMesh(), false);
        made->finish();
        return made;
    }();
    return type;
}

void registerGeometryNodes() {
    static const bool once = [] {
        for (const auto& type : {geometryFilterClass(), deformerClass(), meshClass()})
            addNodeClass(type);
        setBaseClass(HPxNode::kGeometryFilterNode, geometryFilterClass());
        setBaseClass(HPxNode::kDeformerNode, deformerClass());
        return true;
    }();
    static_cast<void>(once);
}

} // namespace OpenQuarn

namespace {

HObject object(const std::shared_ptr<OpenQuarn::Attribute>& attribute) {
    return OpenQuarn::Access::object(attribute);
}

} // namespace

const HObject HPxGeometryFilter::input = object(OpenQuarn::filterAttributes().input);
const HObject HPxGeometryFilter::inputGeometry = object(OpenQuarn::filterAttributes().inputGeometry);
const HObject HPxGeometryFilter::componentTagExpression = object(OpenQuarn::filterAttributes().componentTagExpression);
const HObject HPxGeometryFilter::originalGeometry = object(OpenQuarn::filterAttributes().originalGeometry);
const HObject HPxGeometryFilter::outputGeom = object(OpenQuarn::filterAttributes().outputGeom);
const HObject HPxGeometryFilter::envelope = object(OpenQuarn::filterAttributes().envelope);
const HObject HPxDeformerNode::weightList = object(OpenQuarn::filterAttributes().weightList);
const HObject HPxDeformerNode::weights = object(OpenQuarn::filterAttributes().weights);
