// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HNodeMessage.h"

#include "core/apiCall.h"
#include "graph/Graph.h"

using OpenQuarn::Access;
using OpenQuarn::Operation;

HStatus HMessage::removeCallback(HCallbackId id) {
    return OpenQuarn::apiCall(Operation::HMessage_removeCallback, [&]() -> HStatus {
        OpenQuarn::removeCallback(id);
        return HStatus::kSuccess;
    });
}

HCallbackId HNodeMessage::addAttributeChangedCallback(const HObject& node, HAttributeChangedFunction function,
                                                      void* clientData, HStatus* status) {
    return OpenQuarn::apiValue(
        Operation::HNodeMessage_addAttributeChangedCallback, status, HCallbackId{0}, [&](HStatus& outcome) {
            const auto watched = Access::as<OpenQuarn::Node>(node);
            if (watched && function)
                return watched->graph().addCallback(*watched, function, clientData);
            outcome = {HStatus::kInvalidParameter, watched ? "the function is null" : "the object is no node"};
            return HCallbackId{0};
        });
}
