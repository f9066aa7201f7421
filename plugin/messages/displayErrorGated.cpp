// SPDX-License-Identifier: Apache-2.0
#include "messages/displayErrorGated.h"

#include "openquarn/HAnimControl.h"
#include "openquarn/HDGContext.h"
#include "openquarn/HGlobal.h"

namespace neuralWarp {

bool displayErrorGated(const HString& text) {
    if (!HDGContext::current().isNormal() || HAnimControl::isPlaying() || HAnimControl::isScrubbing())
        return false;
    HGlobal::displayError(text);
    return true;
}

} // namespace neuralWarp
