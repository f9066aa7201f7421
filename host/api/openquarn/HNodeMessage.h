// SPDX-License-Identifier: Apache-2.0
// Being told of changes.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"
#include "openquarn/HStatus.h"

#include <cstdint>

/// Names a callback; 0 names none.
using HCallbackId = std::uint64_t;

class OPENQUARN_API HMessage {
public:
    /// Fails when no callback has that id. [main]
    static HStatus removeCallback(HCallbackId id);
};

class OPENQUARN_API HNodeMessage : public HMessage {
public:
    /// What happened; the values are bits of a mask and part of the API.
    enum AttributeMessage : int {
        kConnectionMade = 1,
        kConnectionBroken = 2,
        kAttributeSet = 8,
        kAttributeLocked = 16,
        kAttributeUnlocked = 32,
        kOtherPlugSet = 64,       ///< `otherPlug` is valid
        kIncomingDirection = 128, ///< of a connection: `plug` is its destination
        kAttributeArrayAdded = 256,
        kAttributeArrayRemoved = 512,
    };

    /// `mask` bits of AttributeMessage; `plug` the plug that changed, `otherPlug` the other side of a connection, else
    /// null. Called on the main thread, after the change; what it throws becomes a message.
    using HAttributeChangedFunction = void (*)(int mask, HPlug& plug, HPlug& otherPlug, void* clientData);

    /// From now on, `function` is called when an attribute of the node is set, connected, disconnected, locked, or gets
    /// or loses an element. The node's deletion ends it. 0, and a failure, for a null node or function. [main]
    static HCallbackId addAttributeChangedCallback(const HObject& node, HAttributeChangedFunction function,
                                                   void* clientData = nullptr, HStatus* status = nullptr);
};
