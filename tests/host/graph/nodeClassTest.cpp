// SPDX-License-Identifier: Apache-2.0
// What a node type refuses while it is put together, and that it is whole afterwards.
#include "host/support/SceneTest.h"
#include "host/support/attributes.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HGlobal.h"

#include <cmath>
#include <functional>
#include <stdexcept>

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

TEST_F(NodeClassTest, ARefusedAttributeLeavesNothingBehind) {
    testAttributes::addType<HPxNode, addWithClashes, 0x7111>("clash");
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
    Nested() { HFnDependencyNode().create("testSum", "inner"); }
    void postConstructor() override {
        if (suicidal)
            HGlobal::executeCommand("deleteNode " + name());
    }
    static inline bool suicidal = false;
};

TEST_F(NodeClassTest, CreatorsMayCreateAndConstructorsMayDelete) {
    testAttributes::addType<Nested, nullptr, 0x7112>("nested");
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

TEST_F(NodeClassTest, DefinitionsThatMakeNoSenseAreRefusedByName) {
    const double nan = std::nan("");
    const struct {
        const char* error;
        std::function<HStatus(HFnNumericAttribute&, HFnEnumAttribute&)> define;
    } rows[] = {
        {"attribute 'x': its default is not a number (NaN)", [&](auto& x, auto&) { return x.setDefault(nan); }},
        {"attribute 'x': its limit is not a number (NaN)", [&](auto& x, auto&) { return x.setSoftMax(nan); }},
        {"attribute 'x': its min 2.5 is above its max 2", [](auto& x, auto&) { return x.setMin(2.5); }},
        {"attribute 'x': its min 1 is above its max 0", [](auto& x, auto&) { return x.setMax(0.0); }},
        {"attribute 'x': its softMin 7 is above its softMax 5", [](auto& x, auto&) { return x.setSoftMin(7.0); }},
        {"attribute 'mode' labels 1 as 'Fast' already", [](auto&, auto& mode) { return mode.addField("Slow", 1); }},
        {"attribute 'mode' has the label 'Fast' for 1 already",
         [](auto&, auto& mode) { return mode.addField("Fast", 2); }},
    };
    HFnNumericAttribute x;
    x.create("x", "x", HFnNumericData::kDouble, 1.5);
    x.setMin(1.0);
    x.setMax(2.0);
    x.setSoftMax(5.0);
    HFnEnumAttribute mode;
    mode.create("mode", "m");
    mode.addField("Fast", 1);
    for (const auto& row : rows)
        EXPECT_EQ(testNodes::text(row.define(x, mode)), row.error);
    EXPECT_EQ(std::vector({x.defaultValue(), x.getMin(), x.getMax(), x.getSoftMax()}),
              std::vector({1.5, 1.0, 2.0, 5.0}));
    EXPECT_FALSE(x.hasSoftMin());
    EXPECT_EQ(mode.fieldName(2), "");
    HStatus status;
    EXPECT_TRUE(HFnNumericAttribute().create("bad", "b", HFnNumericData::kFloat, nan, &status).isNull());
    EXPECT_THAT(testNodes::text(status), ::testing::HasSubstr("attribute 'bad': its default"));
}

// a compound with a child, and what is declared: (affecting, affected), "tree" or a refusal
HStatus declareDoubtfully() {
    const HObject a = made("a", "a");
    const HObject pair = testAttributes::compound("pair", {a});
    const HObject out = made("out", "o"), other = made("other", "ot"), third = made("third", "t");
    for (const HObject& attribute : {pair, out, other, third})
        EXPECT_EQ(testNodes::text(HPxNode::addAttribute(attribute)), "");
    EXPECT_THAT(testNodes::text(HPxNode::attributeAffects(out, out)),
                ::testing::HasSubstr("attribute 'out' of node type 'doubtful' cannot affect itself"));
    EXPECT_THAT(testNodes::text(HPxNode::attributeAffects(a, pair)),
                ::testing::HasSubstr("attribute 'a' of node type 'doubtful' cannot affect 'pair', with which it"));
    EXPECT_TRUE(HPxNode::attributeAffects(pair, a).error());
    HPxNode::attributeAffects(pair, out);
    HPxNode::attributeAffects(pair, other);
    HPxNode::attributeAffects(a, other);
    return HPxNode::attributeAffects(pair, third, true);
}

class Thrower : public HPxNode {
public:
    void postConstructor() override { throw std::runtime_error("no luck"); }
};

TEST_F(NodeClassTest, DoubtfulTypesAreWarnedOfAndNodesThatThrowAreNotLeftBehind) {
    testAttributes::addType<Thrower, declareDoubtfully, 0x7113>("doubtful");
    EXPECT_THAT(takeMessages(),
                ::testing::ElementsAre("warning: node type 'doubtful': a change of a child of 'pair' does "
                                       "not count for 'out': neither the children affect it nor the "
                                       "whole tree"));
    const std::size_t before = session.nodeCount();
    HStatus status;
    EXPECT_TRUE(HFnDependencyNode().create("doubtful", "gone", &status).isNull());
    EXPECT_THAT(testNodes::text(status), ::testing::HasSubstr("node 'gone' was not created: postConstructor: no luck"));
    EXPECT_EQ(takeMessages(), std::vector<std::string>{"error: gone: postConstructor: no luck"});
    EXPECT_EQ(session.nodeCount(), before);
    EXPECT_TRUE(testNodes::plug("gone.out").isNull());
}

} // namespace
