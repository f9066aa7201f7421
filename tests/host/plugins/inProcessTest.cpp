// SPDX-License-Identifier: Apache-2.0
// Registration, through plug-ins that are part of the test.
#include "host/plugins/TinyTypes.h"

#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

#include <gtest/gtest.h>

namespace {

HStatus registerOne(HObject plugin) {
    HFnPlugin set(plugin, "Makers", "1.2");
    const HStatus status = set.registerNode("tinyNode", tinyNodeId, createTinyNode, initializeTinyNode);
    return status.error() ? status : set.registerData("tinyData", tinyDataId, createTinyData);
}

HStatus deregisterOne(HObject plugin) {
    HFnPlugin set(plugin);
    const HStatus status = set.deregisterNode(tinyNodeId);
    return status.error() ? status : set.deregisterData(tinyDataId);
}

TEST(InProcess, NodesOfTheTypeExistBetweenAddAndUnload) {
    const OpenQuarn::Session session;
    OpenQuarn::addPlugin("one", registerOne, deregisterOne);
    const OpenQuarn::PluginInfo info = OpenQuarn::pluginInfo("one");
    EXPECT_EQ(info.vendor, "Makers");
    EXPECT_EQ(info.version, "1.2");
    EXPECT_EQ(info.nodeTypes, std::vector<std::string>{"tinyNode"});
    EXPECT_EQ(info.dataTypes, std::vector<std::string>{"tinyData"});

    HStatus status;
    HFnDependencyNode().create("tinyNode", "made", &status);
    EXPECT_FALSE(status.error()) << status.errorString().asChar();
}

} // namespace
