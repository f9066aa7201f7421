// SPDX-License-Identifier: Apache-2.0
#include "neuralWarp/support/warpRig.h"

#include "openquarn_app/Plugins.h"
#include "plugin/registration.h"

void warpRig::registerPlugin() {
    OpenQuarn::addPlugin("neuralWarp", neuralWarp::registerPlugin, neuralWarp::deregisterPlugin);
}
