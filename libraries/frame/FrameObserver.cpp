// SPDX-License-Identifier: Apache-2.0
#include "frame/FrameObserver.h"

namespace neuralWarp {

FrameObserver& FrameObserver::none() {
    static FrameObserver observer;
    return observer;
}

} // namespace neuralWarp
