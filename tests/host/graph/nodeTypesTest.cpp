// SPDX-License-Identifier: Apache-2.0
// What an application is told of node types is what their plug-in made.
#include "host/support/SceneTest.h"
#include "host/support/attributes.h"

#include "openquarn/HPxDeformerNode.h"
#include "openquarn_app/NodeTypes.h"

#include <stdexcept>

namespace {

using ::testing::ElementsAre;
using ::testing::Pair;

// a deformer type with two compounds, one inside the other, and every flag away from where it begins
HStatus addEverything() {
    HFnNumericAttribute number;
    const HObject ratio = number.create("ratio", "ra", HFnNumericData::kFloat, 0.1);
    number.setMin(-1.0);
    number.setMax(2.0);
    number.setSoftMin(-0.5);
    number.setSoftMax(0.5);
    number.setKeyable(false);
    HFnEnumAttribute choice;
    choice.create("choice", "ch", 7);
    choice.addField("Seven", 7);
    choice.addField("Three", 3);
    HFnStringData text;
    HFnTypedAttribute typed;
    const HObject path = typed.create("path", "pa", HFnData::kString, text.create("here"));
    typed.setUsedAsFilename(true);
    const HObject own = typed.create("own", "ow", HTypeId(0x7191));
    typed.setArray(true);
    typed.setReadable(false);
    typed.setConnectable(false);
    typed.setStorable(false);
    typed.setHidden(true);
    typed.setIndexMatters(false);
    typed.setUsesArrayDataBuilder(true);
    typed.setDisconnectBehavior(HFnAttribute::kReset);
    const HObject outer =
        testAttributes::compound("outer", {testAttributes::compound("inner", {path, own}), choice.object()});
    HPxNode::addAttribute(outer);
    HPxNode::addAttribute(ratio);
    HPxNode::attributeAffects(ratio, HPxGeometryFilter::outputGeom);
    HPxNode::attributeAffects(HPxGeometryFilter::inputGeometry, HPxGeometryFilter::outputGeom);
    return HPxNode::attributeAffects(outer, ratio, true);
}

class NodeTypesTest : public SceneTest {
protected:
    NodeTypesTest() {
        testAttributes::addType<HPxDeformerNode, addEverything, 0x7190, HPxNode::kDeformerNode>("everything");
    }

    static OpenQuarn::AttributeInfo attribute(const std::string& name) {
        for (OpenQuarn::AttributeInfo& info : OpenQuarn::attributesOf("everything"))
            if (info.name == name)
                return info;
        throw std::runtime_error("no attribute " + name);
    }
};

std::string flagsOf(const OpenQuarn::AttributeInfo& info) {
    const std::pair<bool, const char*> flags[] = {
        {info.array, " array"},
        {info.usesArrayDataBuilder, " builder"},
        {!info.indexMatters, " anyIndex"},
        {!info.readable, " unread"},
        {!info.writable, " unwritten"},
        {!info.connectable, " unconnected"},
        {!info.storable, " unstored"},
        {info.keyable, " keyable"},
        {info.hidden, " hidden"},
        {info.usedAsFilename, " file"},
        {info.disconnectBehavior == HFnAttribute::kReset, " reset"},
    };
    std::string text;
    for (const auto& [isSet, name] : flags)
        text += isSet ? name : "";
    return text;
}

TEST_F(NodeTypesTest, AttributesComeInTheirOrderBehindTheInheritedOnesWithTheirFlags) {
    std::vector<std::string> all;
    for (const OpenQuarn::AttributeInfo& info : OpenQuarn::attributesOf("everything"))
        all.push_back(info.parent + (info.inherited ? "<" + info.name : "." + info.name + flagsOf(info)));
    EXPECT_THAT(all, ElementsAre("<message", "<input", "input<inputGeometry", "input<componentTagExpression",
                                 "<originalGeometry", "<outputGeom", "<envelope", "<weightList", "weightList<weights",
                                 ".outer", "outer.inner", "inner.path file",
                                 "inner.own array builder anyIndex unread unconnected unstored hidden reset",
                                 "outer.choice keyable", ".ratio"));
}

TEST_F(NodeTypesTest, ValuesAreThoseOfTheDefinition) {
    const OpenQuarn::AttributeInfo ratio = attribute("ratio");
    EXPECT_EQ(ratio.shortName, "ra");
    EXPECT_EQ(ratio.valueType, "float");
    EXPECT_EQ(ratio.defaultNumber, static_cast<double>(0.1F));
    EXPECT_THAT((std::vector{ratio.min, ratio.max, ratio.softMin, ratio.softMax}), ElementsAre(-1.0, 2.0, -0.5, 0.5));
    const OpenQuarn::AttributeInfo choice = attribute("choice");
    EXPECT_EQ(choice.kind, HFn::kEnumAttribute);
    EXPECT_EQ(choice.defaultNumber, 7.0);
    EXPECT_THAT(choice.fields, ElementsAre(Pair(7, "Seven"), Pair(3, "Three")));
    EXPECT_FALSE(choice.min || choice.max || choice.softMin || choice.softMax);
    EXPECT_EQ(HFnStringData(attribute("path").defaultData).string(), "here");
    EXPECT_EQ(attribute("own").valueType, "pluginData");
    EXPECT_EQ(attribute("own").pluginDataType, HTypeId(0x7191));
    EXPECT_TRUE(attribute("own").defaultData.isNull());
}

TEST_F(NodeTypesTest, DependenciesStandAsTheyWereDeclared) {
    std::vector<std::string> own;
    std::vector<std::string> inherited;
    for (const OpenQuarn::AffectsInfo& info : OpenQuarn::dependenciesOf("everything"))
        (info.inherited ? inherited : own)
            .push_back(info.affecting + ">" + info.affected + (info.tree ? " tree" : "") +
                       (info.sameElement ? " same" : ""));
    EXPECT_THAT(own, ElementsAre("ratio>outputGeom", "inputGeometry>outputGeom", "outer>ratio tree"));
    EXPECT_THAT(inherited, ::testing::Contains("inputGeometry>outputGeom same"));
    EXPECT_EQ(inherited.size(), OpenQuarn::dependenciesOf("deformer").size());
}

TEST_F(NodeTypesTest, TypesAreFoundByName) {
    EXPECT_THAT(OpenQuarn::nodeTypes(), ::testing::IsSupersetOf({"dependNode", "everything", "mesh", "testSum"}));
    EXPECT_THAT([] { OpenQuarn::attributesOf("nothing"); },
                ::testing::ThrowsMessage<std::runtime_error>("there is no node type 'nothing'"));
    OpenQuarn::unloadPlugin("everything");
    EXPECT_THROW(OpenQuarn::dependenciesOf("everything"), std::runtime_error);
}

} // namespace
