// SPDX-License-Identifier: Apache-2.0
// Changes to the graph, collected and made together.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"
#include "openquarn/HStatus.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

#include <functional>
#include <vector>

/// Collects changes; doIt() makes them, in order. Each collecting call checks what can be checked by then and fails
/// without collecting anything; doIt() stops at the first change that fails and leaves the ones before it made. A
/// change that was made is not made again by the next doIt(). Nothing is undone. [main] throughout.
class OPENQUARN_API HDGModifier {
public:
    /// Makes a node of that type at once, so that it can be named in further changes. Null on failure.
    HObject createNode(const HString& typeName, HStatus* status = nullptr);
    HObject createNode(const HTypeId& type, HStatus* status = nullptr);
    HStatus deleteNode(const HObject& node);
    HStatus renameNode(const HObject& node, const HString& name);
    HStatus connect(const HPlug& source, const HPlug& destination);
    HStatus disconnect(const HPlug& source, const HPlug& destination);
    /// Removes an element of an array. `breakConnections` false: it must not be connected when its turn comes.
    HStatus removeMultiInstance(const HPlug& element, bool breakConnections);
    HStatus newPlugValueDouble(const HPlug& plug, double value);
    HStatus newPlugValueInt(const HPlug& plug, int value);
    HStatus newPlugValueString(const HPlug& plug, const HString& value);
    HStatus newPlugValue(const HPlug& plug, const HObject& data);
    /// A command line, run as HGlobal::executeCommand() does.
    HStatus commandToExecute(const HString& command);
    HStatus doIt();

private:
    std::vector<std::function<HStatus()>> changes_;
};
