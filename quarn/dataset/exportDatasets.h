// SPDX-License-Identifier: Apache-2.0
// Training data sets of the geometries of a deformer.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/dataset/smoothingChoice.h"
#include "quarn/fit/targetFit.h"
#include "quarn/scene/PartFrames.h"
#include "quarn/scene/SceneSession.h"

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// What `quarn export` is told by its flags.
struct ExportOptions {
    SceneOptions scene;
    std::filesystem::path output; ///< of the one geometry, or the folder of the folders of several; empty: by the scene
    std::string deformer;         ///< empty: the only one
    std::string geometry;         ///< index or name; empty: all of them that have a target
    std::string frames;           ///< as frameRange() reads them; empty: exportStartFrame to exportEndFrame
    PartOptions part;             ///< of which whole they are a part, and what comes before them
    std::string smoothing;        ///< "auto": deltas are of the kind that a study speaks for; empty: as the scene says
    std::filesystem::path like;   ///< a data set, of whose kind deltas are; empty: as the scene says
    bool overwrite = false;
    bool anyway = false; ///< a target that does not fit the skin is exported as well
    Console console;
};

/// What has come of a geometry.
struct ExportAnswer {
    std::string geometry;
    std::filesystem::path folder;
    std::size_t rows = 0;
    std::size_t rowsBefore = 0;   ///< of these, rows that an earlier run had made; all of them when it was complete
    std::optional<TargetFit> fit; ///< how far the target is from the skin; none where it was not compared now
    double metersPerUnit = 1.0;
    std::size_t rowsRepeated = 0; ///< of those that this run has made, as many as are equal to the row before
    std::size_t controls = 0;
    std::size_t vertices = 0;
    std::uintmax_t bytes = 0;
    std::optional<KindChoice> choice = {}; ///< of the kind of deltas; none where nothing was compared
};

/// Opens the scene and writes a complete data set for each geometry; of several those without target are noted and left
/// out. Rows that an earlier run of the same set-up has
/// left in FOLDER.part are gone on from; docs/dataset.md says when they are not. A part of a whole gets a PartRecord,
/// and everything that is said of all frames is of the whole. Whatever ends it early, an error or Ctrl-C, leaves FOLDER
/// as it was. Errors are std::runtime_error with the sentence for the user. Thread: main.
std::vector<ExportAnswer> exportDatasets(const ExportOptions& options);

} // namespace quarn
