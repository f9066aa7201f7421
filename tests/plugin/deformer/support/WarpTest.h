// SPDX-License-Identifier: Apache-2.0
// A test with the plug-in registered, a folder for models, and no message that it did not expect.
#pragma once

#include "host/support/SceneTest.h"
#include "plugin/deformer/support/modelFolder.h"
#include "plugin/deformer/support/warpRig.h"
#include "support/StdoutCapture.h"
#include "support/TemporaryFolder.h"

class WarpTest : public SceneTest {
protected:
    WarpTest() { warpRig::registerPlugin(); }

    std::filesystem::path modelDirectory(const std::string& name = "model") const {
        return folder.path() / (name + ".nwrp");
    }

    TemporaryFolder folder;
};
