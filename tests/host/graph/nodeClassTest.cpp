// SPDX-License-Identifier: Apache-2.0
// What a node type refuses while it is put together, and that it is whole afterwards.
#include "host/support/SceneTest.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HGlobal.h"
#include "openquarn_app/Plugins.h"

namespace {

using NodeClassTest = SceneTest;

HObject made(const char* longName, const char* shortName) {
    return HFnNumericAttribute().create(longName, shortName, HFnNumericData::kDouble);
}

// goes on after each refusal, as a careless plug-in does
HStatus addWithClashes() {
    HFnCompoundAttribute group, twins;
    const HObject first = made("first", "f");
    EXPECT_FALSE(HPxNode::addAttribute(first).error());
    group.create("group", "g");
    group.addChild(made("inside", "f"));
    EXPECT_EQ(testNodes::text(HPxNode::addAttribute(group.object())),
              "HPxNode::addAttribute: node type 'clash' has an attribute named 'f' already");
    EXPECT_TRUE(HPxNode::addAttribute(made("other", "f")).error());
    EXPECT_TRUE(HPxNode::addAttribute(first).error());
    twins.create("outer", "o");
    HFnCompoundAttribute inner;
    inner.create("inner", "i");
    inner.addChild(made("outer", "deep"));
    twins.addChild(inner.object());
    EXPECT_TRUE(HPxNode::addAttribute(twins.object()).error());
    const HObject last = made("last", "last");
    EXPECT_FALSE(HPxNode::addAttribute(last).error());
    return HPxNode::attributeAffects(first, last);
}

HStatus registerClash(HObject plugin) {
    return HFnPlugin(plugin).registerNode(
        "clash", 0x7111, []() -> HPxNode* { return new HPxNode; }, addWithClashes);
}
HStatus deregisterClash(HObject plugin) {
    return HFnPlugin(plugin).deregisterNode(0x7111);
}

TEST_F(NodeClassTest, ARefusedAttributeLeavesNothingBehind) {
    OpenQuarn::addPlugin("clash", registerClash, deregisterClash);
    HFnDependencyNode node;
    ASSERT_FALSE(node.create("clash").isNull());
    for (const char* name : {"group", "g", "inside", "other", "outer", "o", "inner", "deep"})
        EXPECT_TRUE(node.attribute(name).isNull()) << name;
    EXPECT_EQ(node.attributeCount(), 3U); // message, first, last
    HPlug first = node.findPlug("first");
    EXPECT_FALSE(first.setDouble(2.0).error());
    EXPECT_EQ(node.findPlug("last").asDouble(), 0.0);
}

// makes another node before its own, and deletes itself when it is told to
class Nested : public HPxNode {
public:
    static HPxNode* creator() {
        HFnDependencyNode().create("testSum", "inner");
        return new Nested;
    }
    void postConstructor() override {
        if (suicidal)
            HGlobal::executeCommand("deleteNode " + name());
    }
    static bool suicidal;
};
bool Nested::suicidal = false;

TEST_F(NodeClassTest, CreatorsMayCreateAndConstructorsMayDelete) {
    OpenQuarn::addPlugin(
        "nested",
        [](HObject plugin) { return HFnPlugin(plugin).registerNode("nested", 0x7112, Nested::creator, nullptr); },
        [](HObject plugin) { return HFnPlugin(plugin).deregisterNode(0x7112); });
    HFnDependencyNode node;
    node.create("nested", "outer");
    ASSERT_NE(node.userNode(), nullptr);
    EXPECT_EQ(node.userNode()->name(), "outer");

    Nested::suicidal = true;
    HStatus status;
    EXPECT_TRUE(node.create("nested", "gone", &status).isNull());
    EXPECT_EQ(testNodes::text(status), "HFnDependencyNode::create: node 'gone' was deleted while it was created");
    Nested::suicidal = false;
}

TEST_F(NodeClassTest, CompoundsCannotHoldThemselves) {
    HFnCompoundAttribute outer, inner;
    outer.create("outer", "o");
    inner.create("inner", "i");
    EXPECT_TRUE(outer.addChild(outer.object()).error());
    ASSERT_FALSE(outer.addChild(inner.object()).error());
    EXPECT_EQ(testNodes::text(inner.addChild(outer.object())), "attribute 'outer' has its place already");
    EXPECT_EQ(inner.numChildren(), 0U);
}

} // namespace
