// SPDX-License-Identifier: Apache-2.0
#include "rigSceneTarget.h"

#include "entry/registration.h"
#include "openquarn_app/Plugins.h"
#include "rig/registration.h"
#include "sceneTarget.h"

bool fuzzRigScene(const std::uint8_t* data, std::size_t size) {
    return fuzzSceneWith(data, size, [] {
        OpenQuarn::addPlugin("quarnRig", rig::registerNodes, rig::deregisterNodes);
        OpenQuarn::addPlugin("neuralWarp", neuralWarp::registerPlugin, neuralWarp::deregisterPlugin);
    });
}
