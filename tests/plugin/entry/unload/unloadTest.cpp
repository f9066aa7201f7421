// SPDX-License-Identifier: Apache-2.0
#include "openquarn_app/Faults.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"
#include "plugin/deformer/support/modelFolder.h"
#include "plugin/deformer/support/warpRig.h"
#include "support/TemporaryFolder.h"

#include <gtest/gtest.h>

#include <dlfcn.h>
#include <stdexcept>
#include <string>
#include <utility>

namespace {

bool isMapped() {
    void* const handle = dlopen(NW_PLUGIN, RTLD_NOW | RTLD_NOLOAD);
    if (handle)
        dlclose(handle);
    return handle != nullptr;
}

/// A geometry that a model with Surface mode, smoothing and principal shapes moves by (0, 0, `control`).
class Unloading : public testing::Test {
protected:
    Unloading() {
        ModelSpec spec;
        spec.fullCount = spec.affectCount = 81;
        spec.smoothingIterations = 3;
        spec.bias = {0.0F};
        spec.weights = {1.0F};
        spec.shapes.resize(1);
        for (unsigned vertex = 0; vertex < spec.fullCount; ++vertex)
            spec.shapes[0].insert(spec.shapes[0].end(), {0.0F, 0.0F, 1.0F});
        writeModel(folder_.path() / "model.nwrp", spec);
    }

    void deform(double control) {
        const HObject mesh = warpRig::mesh(makeGrid(8, 8));
        warpRig::Rig rig;
        rig.addGeometry(0, {.mesh = mesh});
        rig.setModelRoot(folder_.path());
        rig.setControls({control});
        ASSERT_EQ(rig.deform(0), HStatus::kSuccess);
        const HPointArray before = warpRig::pointsOf(mesh), after = rig.result(0);
        for (unsigned vertex = 0; vertex < before.length(); ++vertex) {
            const HVector moved = after[vertex] - before[vertex];
            ASSERT_NEAR(moved.x, 0.0, 1e-5);
            ASSERT_NEAR(moved.y, 0.0, 1e-5);
            ASSERT_NEAR(moved.z, control, 1e-5);
        }
    }

private:
    TemporaryFolder folder_;
};

TEST_F(Unloading, GoesCompletelyAndComesBackFiftyTimes) {
    std::string shown;
    const auto previous = OpenQuarn::setMessageSink([&](const OpenQuarn::Message& m) { shown += m.text + '\n'; });
    OpenQuarn::Session session;
    for (int round = 1; round <= 50; ++round) {
        SCOPED_TRACE(round);
        ASSERT_EQ(OpenQuarn::loadPlugin(NW_PLUGIN), "neuralWarp");
        ASSERT_TRUE(isMapped());
        ASSERT_NO_FATAL_FAILURE(deform(0.125 * round));
        session.newScene();
        EXPECT_EQ(shown, "");
        if (round <= 4) { // each time another step fails first; it can be tried again
            OpenQuarn::Faults::fail("HFnPlugin::deregisterNode", round);
            EXPECT_THROW(OpenQuarn::unloadPlugin("neuralWarp"), std::runtime_error);
            EXPECT_EQ(std::exchange(shown, "").substr(0, 10), "deregister") << "its own line about the step";
        }
        OpenQuarn::unloadPlugin("neuralWarp");
        ASSERT_FALSE(isMapped());
    }
    EXPECT_EQ(shown, "");
    OpenQuarn::setMessageSink(previous);
}

} // namespace
