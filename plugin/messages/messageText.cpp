// SPDX-License-Identifier: Apache-2.0
#include "messages/messageText.h"

#include "openquarn/HStringResource.h"

namespace neuralWarp {

HString messageText(const HStringResourceId& id) {
    HStatus status;
    HString text = HStringResource::getString(id, status);
    return status == HStatus::kFailure ? HString("unknown error") : text;
}

HString messageText(Text text) {
    return messageText(idOf(text));
}

} // namespace neuralWarp
