// SPDX-License-Identifier: Apache-2.0
// A plug-in to begin with: a deformer, a node and a command. Copy the folder, change the names and the ids, and take
// out what you do not need.
//
// Everything a plug-in keeps in static variables belongs to the library, and goes when the plug-in is unloaded.
#include "openquarn/HArgDatabase.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HItGeometry.h"
#include "openquarn/HPxCommand.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn/HSelectionList.h"
#include "openquarn_helpers/AttributeMaker.h"
#include "openquarn_helpers/guard.h"

namespace {

// Ids are written into scene files: choose your own once, and keep them.
constexpr HTypeId pushId{0x6d000001};
constexpr HTypeId remapId{0x6d000002};

using openquarn_helpers::AttributeMaker; // remembers the first step that fails
using openquarn_helpers::guarded;        // nothing is thrown at the host

// --- a deformer: moves vertices along a direction ---

class PushDeformer : public HPxDeformerNode {
public:
    // The handles on the attributes of the type, made once by initialize().
    static HObject amount;
    static HObject directionX;
    static HObject directionY;
    static HObject directionZ;

    static HPxNode* create() { return new PushDeformer; }

    static HStatus initialize() {
        AttributeMaker make;
        amount = make.real("amount", "am");
        directionX = make.real("directionX", "dx");
        directionY = make.real("directionY", "dy", 1.0);
        directionZ = make.real("directionZ", "dz");
        make.add({amount, directionX, directionY, directionZ});
        // whatever changes one of these, the deformed geometry has to be made again
        make.affects({amount, directionX, directionY, directionZ}, {outputGeom});
        return make.status();
    }

    // Called for each geometry that needs it. The iterator visits the vertices that the node affects, in the order of
    // the weights. Nothing to do is a success.
    HStatus deform(HDataBlock& block, HItGeometry& vertices, const HMatrix&, unsigned multiIndex) override {
        return guarded(*this, "deform", [&]() -> HStatus {
            const double distance = block.inputValue(amount).asDouble() * block.inputValue(envelope).asFloat();
            const HVector step(distance * block.inputValue(directionX).asDouble(),
                               distance * block.inputValue(directionY).asDouble(),
                               distance * block.inputValue(directionZ).asDouble());
            HStatus status;
            const float* vertexWeights = envelopeWeights(block, multiIndex, &status); // null: all are 1
            if (status.error())
                return status;
            HPointArray points; // not a member: several geometries may be deformed at the same time
            status = vertices.allPositions(points);
            if (status.error())
                return status;
            for (unsigned i = 0; i < points.length(); ++i)
                points[i] += vertexWeights ? step * static_cast<double>(vertexWeights[i]) : step;
            return vertices.setAllPositions(points);
        });
    }
};

HObject PushDeformer::amount;
HObject PushDeformer::directionX;
HObject PushDeformer::directionY;
HObject PushDeformer::directionZ;

// --- a node: remaps a number from one range to another ---

class RemapNode : public HPxNode {
public:
    static HObject input;
    static HObject inputMax;
    static HObject outputMax;
    static HObject output;

    static HPxNode* create() { return new RemapNode; }

    static HStatus initialize() {
        AttributeMaker make;
        input = make.real("input", "i");
        inputMax = make.real("inputMax", "im", 1.0);
        outputMax = make.real("outputMax", "om", 1.0);
        output = make.real("output", "o", 0.0, openquarn_helpers::outputFlags);
        make.add({input, inputMax, outputMax, output});
        make.affects({input, inputMax, outputMax}, {output});
        return make.status();
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (plug.attribute() != output)
            return HStatus::kUnknownParameter; // not ours: the host takes the value as it is
        const double range = block.inputValue(inputMax).asDouble();
        if (range == 0.0)
            return {HStatus::kFailure, "inputMax is 0: there is no range to remap from"};
        HDataHandle result = block.outputValue(output);
        result.set(block.inputValue(input).asDouble() / range * block.inputValue(outputMax).asDouble());
        return block.setClean(plug);
    }
};

HObject RemapNode::input;
HObject RemapNode::inputMax;
HObject RemapNode::outputMax;
HObject RemapNode::output;

// --- a command: how many of the named nodes are of this plug-in's types ---

class CountCommand : public HPxCommand {
public:
    static HPxCommand* create() { return new CountCommand; }

    // minimalCount [-verbose] NODE...
    static HSyntax syntax() {
        HSyntax made;
        made.addFlag("-v", "-verbose");
        made.setObjectType(HSyntax::kStringObjects, 1);
        return made;
    }

    HStatus doIt(const HArgList& args) override {
        HStatus status;
        const HArgDatabase words(syntax(), args, &status);
        if (status.error())
            return status;
        HArgList names;
        status = words.getObjects(names);
        int count = 0;
        for (unsigned i = 0; !status.error() && i < names.length(); ++i)
            status = countOne(names.asString(i), words.isFlagSet("-verbose"), count);
        return status.error() ? status : setResult(count);
    }

private:
    static HStatus countOne(const HString& name, bool verbose, int& count) {
        HSelectionList list;
        HObject node;
        HStatus status = list.add(name);
        if (!status.error())
            status = list.getDependNode(0, node);
        if (status.error())
            return status; // its text names the node that there is not
        const HTypeId type = HFnDependencyNode(node).typeId();
        const bool ours = type == pushId || type == remapId;
        count += ours ? 1 : 0;
        if (verbose)
            displayInfo(name + (ours ? " is one of mine" : " is another's"));
        return HStatus::kSuccess;
    }
};

} // namespace

// --- what the host looks for in the library ---

extern "C" OPENQUARN_API const char HApiVersion[8];
const char HApiVersion[8] = OPENQUARN_API_VERSION;

extern "C" OPENQUARN_API HStatus initializePlugin(HObject object);
HStatus initializePlugin(HObject object) {
    HStatus status;
    HFnPlugin plugin(object, "Your name", "1.0", "Any", &status);
    // when a step fails, the host takes back the ones before it
    if (!status.error())
        status = plugin.registerNode("minimalPush", pushId, PushDeformer::create, PushDeformer::initialize,
                                     HPxNode::kDeformerNode);
    if (!status.error())
        status = plugin.registerNode("minimalRemap", remapId, RemapNode::create, RemapNode::initialize);
    if (!status.error())
        status = plugin.registerCommand("minimalCount", CountCommand::create, CountCommand::syntax);
    return status;
}

extern "C" OPENQUARN_API HStatus uninitializePlugin(HObject object);
HStatus uninitializePlugin(HObject object) {
    HFnPlugin plugin(object);
    HStatus status = plugin.deregisterCommand("minimalCount");
    if (!status.error())
        status = plugin.deregisterNode(remapId);
    if (!status.error())
        status = plugin.deregisterNode(pushId);
    return status;
}
