// SPDX-License-Identifier: Apache-2.0
// A plug-in with one node, one data type and one command. What each of its variants does wrong is defined when it is
// compiled (see CMakeLists.txt beside the tests).
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HNodeMessage.h"
#include "openquarn/HPxCommand.h"
#include "openquarn/HPxData.h"
#include "openquarn/HSelectionList.h"

#include <stdexcept>

#ifndef NODE_NAME
#define NODE_NAME "tinyNode"
#define NODE_ID 0x7001
#define DATA_ID 0x7002
#define COMMAND_NAME "tinyCommand"
#endif
#ifndef REQUIRED
#define REQUIRED "Any"
#endif

#ifndef VERSION
#define VERSION OPENQUARN_API_VERSION
#endif

#ifndef NO_VERSION
extern "C" OPENQUARN_API const char HApiVersion[8];
const char HApiVersion[8] = VERSION;
#endif

namespace {

class TinyNode : public HPxNode {};

class TinyData : public HPxData {
public:
    void copy(const HPxData&) override {}
    HTypeId typeId() const override { return HTypeId(DATA_ID); }
    HString name() const override { return "tinyData"; }
};

class TinyCommand : public HPxCommand {
public:
    HStatus doIt(const HArgList&) override { return setResult("tiny"); }
};

template <class Base, class Tiny>
Base* create() {
    return new Tiny;
}

// what a plug-in keeps of its attributes, as most do: released when the library goes
HObject value;

HStatus initialize() {
    value = HFnNumericAttribute().create("value", "v", HFnNumericData::kDouble, 4.5);
    return HPxNode::addAttribute(value);
}

[[maybe_unused]] HStatus registerAll(HFnPlugin& set) {
    HStatus status = set.registerNode(NODE_NAME, NODE_ID, create<HPxNode, TinyNode>, initialize);
    if (!status.error())
        status = set.registerData(NODE_NAME "Data", DATA_ID, create<HPxData, TinyData>);
    if (!status.error())
        status = set.registerCommand(COMMAND_NAME, create<HPxCommand, TinyCommand>);
    return status;
}

[[maybe_unused]] HStatus deregisterAll(HFnPlugin& set) {
    HStatus status = set.deregisterNode(NODE_ID);
    if (!status.error())
        status = set.deregisterData(DATA_ID);
    if (!status.error())
        status = set.deregisterCommand(COMMAND_NAME);
    return status;
}

void heard(int, HPlug&, HPlug&, void*) {}

[[maybe_unused]] HStatus listenToTime() {
    HSelectionList list;
    HObject time;
    list.add("time1");
    list.getDependNode(0, time);
    HStatus status;
    HNodeMessage::addAttributeChangedCallback(time, heard, nullptr, &status);
    return status;
}

} // namespace

#ifndef NO_INITIALIZE
extern "C" OPENQUARN_API HStatus initializePlugin(HObject plugin);
HStatus initializePlugin(HObject plugin) {
    HStatus status;
    HFnPlugin set(plugin, "Tiny Makers", "3.1", REQUIRED, &status);
    if (!status.error())
        status = registerAll(set);
#ifdef AFTER
    AFTER;
#else
    return status;
#endif
}
#endif

#ifndef NO_UNINITIALIZE
extern "C" OPENQUARN_API HStatus uninitializePlugin(HObject plugin);
HStatus uninitializePlugin([[maybe_unused]] HObject plugin) {
#ifdef BEFORE_END
    BEFORE_END;
#else
    HFnPlugin set(plugin);
    return deregisterAll(set);
#endif
}
#endif
