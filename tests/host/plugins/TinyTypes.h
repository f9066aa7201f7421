// SPDX-License-Identifier: Apache-2.0
// The smallest node, data and command that a plug-in can register.
#pragma once

#include "openquarn/HFnAttribute.h"
#include "openquarn/HPxCommand.h"
#include "openquarn/HPxData.h"
#include "openquarn/HPxNode.h"

constexpr HTypeId tinyNodeId{0x7001};
constexpr HTypeId tinyDataId{0x7002};

class TinyNode : public HPxNode {};

class TinyData : public HPxData {
public:
    void copy(const HPxData&) override {}
    HTypeId typeId() const override { return tinyDataId; }
    HString name() const override { return "tinyData"; }
};

class TinyCommand : public HPxCommand {
public:
    HStatus doIt(const HArgList&) override { return setResult("tiny"); }
};

inline HPxNode* createTinyNode() {
    return new TinyNode;
}
inline HPxData* createTinyData() {
    return new TinyData;
}
inline HPxCommand* createTinyCommand() {
    return new TinyCommand;
}

/// One attribute: "value", a double.
inline HStatus initializeTinyNode() {
    return HPxNode::addAttribute(HFnNumericAttribute().create("value", "v", HFnNumericData::kDouble));
}
