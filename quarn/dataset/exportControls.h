// SPDX-License-Identifier: Apache-2.0
// The control values of a deformer without deltas: there need be no targets yet.
#pragma once

#include "quarn/dataset/exportDatasets.h"

namespace quarn {

/// What has come of it.
struct ControlsAnswer {
    std::filesystem::path folder;
    std::size_t rows = 0;
    std::size_t controls = 0;
};

/// Opens the scene and writes controls.npy and frames.npy, as a data set has them, and controls.json with their names
/// into the folder of the options; without one into trainingDataRoot, as DEFORMER.controls. Throws std::runtime_error
/// with the sentence for the user: for a folder that holds a data set, or such files without `overwrite`; frames that
/// cannot be evaluated; Interrupted. controls.json is written last. Thread: main.
ControlsAnswer exportControls(const ExportOptions& options);

} // namespace quarn
