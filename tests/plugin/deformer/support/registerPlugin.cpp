// SPDX-License-Identifier: Apache-2.0
#include "plugin/deformer/support/warpRig.h"

#include "entry/registration.h"
#include "openquarn_app/Plugins.h"

void warpRig::registerPlugin() {
    OpenQuarn::addPlugin("neuralWarp", neuralWarp::registerPlugin, neuralWarp::deregisterPlugin);
}
