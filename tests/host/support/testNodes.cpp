// SPDX-License-Identifier: Apache-2.0
#include "host/support/testNodes.h"

#include "host/support/attributes.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HSelectionList.h"

#include <gtest/gtest.h>

namespace testNodes {
namespace {

using namespace testAttributes;

HObject onDisconnect(const HObject& attribute, HFnAttribute::DisconnectBehavior behavior) {
    EXPECT_FALSE(HFnAttribute(attribute).setDisconnectBehavior(behavior).error());
    return attribute;
}

void add(std::initializer_list<HObject> attributes) {
    for (const HObject& attribute : attributes)
        EXPECT_EQ(text(HPxNode::addAttribute(attribute)), "");
}

void affects(const HObject& from, const HObject& to, bool tree = false) {
    EXPECT_EQ(text(HPxNode::attributeAffects(from, to, tree)), "");
}

class SumNode : public HPxNode {
public:
    static HStatus initialize() {
        values = onDisconnect(arrayOf(real("values")), HFnAttribute::kDelete);
        scale = real("scale", 1.0);
        HFnNumericAttribute limits(scale);
        limits.setMin(-100.0);
        limits.setMax(100.0);
        const HObject kept = real("kept");
        const HObject reset = onDisconnect(real("reset", 7.0), HFnAttribute::kReset);
        skip = number("skip", HFnNumericData::kBoolean);
        const HObject textAttribute = HFnTypedAttribute().create("text", "text", HFnData::kString);
        const HObject matrix = HFnMatrixAttribute().create("matrix", "matrix");
        HFnEnumAttribute choice;
        choice.create("choice", "choice", 1);
        choice.addField("Zero", 0);
        choice.addField("One", 1);
        choice.addField("Five", 5);
        total = output(real("total"));
        rounded = output(number("rounded", HFnNumericData::kInt));
        add({values, scale, kept, reset, skip, textAttribute, matrix, choice.object(),
             number("short16", HFnNumericData::kShort), number("int32", HFnNumericData::kInt),
             number("single", HFnNumericData::kFloat), real("bare"), total, rounded});
        for (const HObject& input : {values, scale, skip}) {
            affects(input, total);
            affects(input, rounded);
        }
        return HStatus::kSuccess;
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (plug != total && plug != rounded)
            return HStatus::kUnknownParameter;
        double sum = 0.0;
        if (!block.inputValue(skip).asBool()) {
            HStatus status;
            HArrayDataHandle elements = block.inputArrayValue(values, &status);
            for (bool more = elements.elementCount() > 0; more; more = !elements.next().error())
                sum += elements.inputValue().asDouble();
            sum *= block.inputValue(scale).asDouble();
        }
        for (const HObject& output : {total, rounded}) {
            HDataHandle handle = block.outputValue(output);
            handle.set(sum);
            handle.setClean();
        }
        return HStatus::kSuccess;
    }

private:
    static inline HObject values, scale, skip, total, rounded;
};

class ListsNode : public HPxNode {
public:
    static HStatus initialize() {
        items = onDisconnect(arrayOf(real("items")), HFnAttribute::kDelete);
        lists = onDisconnect(arrayOf(compound("lists", {items, real("weight")}), true), HFnAttribute::kDelete);
        const HObject own = real("own");
        const HObject shallow = compound("shallow", {real("leaf"), own});
        const HObject shallowOut = output(real("shallowOut"));
        flat = output(arrayOf(real("flat"), true));
        add({lists, real("note"), shallow, flat, shallowOut});
        affects(lists, flat, true);
        affects(shallow, shallowOut);
        affects(own, shallowOut);
        return HStatus::kSuccess;
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (plug != flat)
            return HStatus::kUnknownParameter;
        HArrayDataHandle outer = block.inputArrayValue(lists);
        HArrayDataHandle output = block.outputArrayValue(flat);
        HArrayDataBuilder builder = output.builder();
        unsigned count = 0;
        for (bool more = outer.elementCount() > 0; more; more = !outer.next().error()) {
            HArrayDataHandle inner = outer.inputValue().childArray(items);
            for (bool another = inner.elementCount() > 0; another; another = !inner.next().error())
                builder.addElement(count++).set(inner.inputValue().asDouble());
        }
        for (unsigned surplus = output.elementCount(); surplus > count; --surplus)
            builder.removeElement(surplus - 1);
        output.set(builder);
        return output.setAllClean();
    }

private:
    static inline HObject lists, items, flat;
};

class CaseNode : public HPxNode {
public:
    static HStatus initialize() {
        const HObject in = real("in");
        const HObject ins = arrayOf(real("ins"));
        const HObject out = output(real("out"));
        const HObject outs = output(arrayOf(real("outs"), true));
        add({in, ins, out, outs});
        for (const HObject& input : {in, ins})
            for (const HObject& output : {out, outs})
                affects(input, output);
        return HStatus::kSuccess;
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override { return Hooks::compute(*this, plug, block); }
    HStatus setDependentsDirty(const HPlug& dirty, HPlugArray& affected) override {
        return Hooks::dependents ? Hooks::dependents(dirty, affected) : HStatus();
    }
    HStatus connectionMade(const HPlug& plug, const HPlug& other, bool asSource) override {
        return tell("made", plug, other, asSource);
    }
    HStatus connectionBroken(const HPlug& plug, const HPlug& other, bool asSource) override {
        return tell("broken", plug, other, asSource);
    }

private:
    static HStatus tell(const char* what, const HPlug& plug, const HPlug& other, bool asSource) {
        if (Hooks::connection)
            Hooks::connection(what, plug, other, asSource);
        return HStatus::kSuccess;
    }
};

HStatus initializePlugin(HObject object) {
    HFnPlugin plugin(object);
    EXPECT_EQ(text(plugin.registerNode("testSum", 0x7e570001, newNode<SumNode>, SumNode::initialize)), "");
    EXPECT_EQ(text(plugin.registerNode("testLists", 0x7e570002, newNode<ListsNode>, ListsNode::initialize)), "");
    EXPECT_EQ(text(plugin.registerNode("testCase", 0x7e570003, newNode<CaseNode>, CaseNode::initialize)), "");
    return HStatus::kSuccess;
}

HStatus uninitializePlugin(HObject object) {
    HFnPlugin plugin(object);
    for (const unsigned id : {0x7e570001U, 0x7e570002U, 0x7e570003U})
        EXPECT_EQ(text(plugin.deregisterNode(id)), "");
    return HStatus::kSuccess;
}

} // namespace

HStatus passOn(HPxNode& node, const HPlug& plug, HDataBlock& block) {
    const HFnDependencyNode set(node.thisHObject());
    if (plug != set.attribute("out"))
        return HStatus::kUnknownParameter;
    return block.outputValue(plug).set(block.inputValue(set.attribute("in")).asDouble());
}

void registerTypes() {
    OpenQuarn::addPlugin("testNodes", initializePlugin, uninitializePlugin);
}

HObject create(const std::string& type, const std::string& name) {
    HStatus status;
    const HObject node = HFnDependencyNode().create(type, name, &status);
    EXPECT_EQ(text(status), "");
    return node;
}

HPlug plug(const std::string& name) {
    HSelectionList list;
    HPlug found;
    if (!list.add(HString(name)).error())
        list.getPlug(0, found);
    return found;
}

void connect(const std::string& source, const std::string& destination) {
    HDGModifier modifier;
    EXPECT_EQ(text(modifier.connect(plug(source), plug(destination))), "");
    EXPECT_EQ(text(modifier.doIt()), "");
}

void disconnect(const std::string& source, const std::string& destination) {
    HDGModifier modifier;
    EXPECT_EQ(text(modifier.disconnect(plug(source), plug(destination))), "");
    EXPECT_EQ(text(modifier.doIt()), "");
}

std::string text(const HStatus& status) {
    return status.errorString().asStdString();
}

} // namespace testNodes
