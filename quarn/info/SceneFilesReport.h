// SPDX-License-Identifier: Apache-2.0
// What has to be there, and what is going to be played, where an open scene is evaluated on another machine.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct SceneFilesReport {
    std::vector<std::filesystem::path>
        files; ///< absolute, each once: the scene file, then what it reads for its frames
    std::vector<std::filesystem::path> missing; ///< of these, the ones that are not there
    std::string frames;                         ///< the export range of the deformer, as --frames takes it; empty: none
    std::optional<double> framesPerSecond;
    std::string deformer;                ///< empty: there is none, or several and none was named
    std::vector<std::string> geometries; ///< of the deformer
};

/// `scene` absolute; `deformer` empty for the only one. The models of all deformers that are on count among the files,
/// and what the character came from where it is still there. Throws std::runtime_error for a deformer that is none.
/// Thread: main.
SceneFilesReport describeFiles(const std::filesystem::path& scene, const std::string& deformer);

std::string filesText(const SceneFilesReport& report);
std::string filesJson(const SceneFilesReport& report);

} // namespace quarn
