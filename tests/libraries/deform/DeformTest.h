// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "nw_deform/Model.h"
#include "plugin/deformer/support/modelFolder.h"
#include "support/TemporaryFolder.h"
#include "support/failureOf.h"
#include "support/meshZoo.h"

#include <gmock/gmock.h>

/// A folder with the model of a grid of nine vertices, which moves all of them in z by its one control.
class DeformTest : public testing::Test {
protected:
    DeformTest() { write(); }

    void write(float height = 0.0F, std::uint32_t passes = 0) const {
        ModelSpec spec;
        spec.bias.clear();
        for (int vertex = 0; vertex < 9; ++vertex) {
            spec.bias.insert(spec.bias.end(), {0.0F, 0.0F, height});
            spec.weights.insert(spec.weights.end(), {0.0F, 0.0F, 1.0F});
        }
        spec.deltaMode = 0;
        spec.smoothingIterations = passes;
        spec.fullCount = spec.affectCount = 9;
        writeModel(directory, spec);
    }

    TemporaryFolder folder;
    const std::filesystem::path directory = folder.path() / "grid.nwrp";
};
