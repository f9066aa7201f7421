// SPDX-License-Identifier: Apache-2.0
// A test with an open session in which the plug-in is loaded, from its library, as a host does it.
#pragma once

#include "host/support/SceneTest.h"

#include "openquarn_app/Plugins.h"

class PluginTest : public SceneTest {
protected:
    PluginTest() { OpenQuarn::loadPlugin(NW_PLUGIN); }
};
