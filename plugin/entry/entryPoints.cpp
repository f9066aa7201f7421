// SPDX-License-Identifier: Apache-2.0
// What the host looks for in the library.
#include "entry/registration.h"

#include "openquarn/HApi.h"

extern "C" OPENQUARN_API const char HApiVersion[8];
const char HApiVersion[8] = OPENQUARN_API_VERSION;

extern "C" OPENQUARN_API HStatus initializePlugin(HObject plugin);
HStatus initializePlugin(HObject plugin) {
    return neuralWarp::registerPlugin(plugin);
}

extern "C" OPENQUARN_API HStatus uninitializePlugin(HObject plugin);
HStatus uninitializePlugin(HObject plugin) {
    return neuralWarp::deregisterPlugin(plugin);
}
