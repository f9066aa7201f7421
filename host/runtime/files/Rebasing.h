// SPDX-License-Identifier: Apache-2.0
// The files that a scene names, named again for another folder.
#pragma once

#include "files/Warnings.h"
#include "openquarn_app/SceneFile.h"

#include <filesystem>
#include <vector>

namespace OpenQuarn {

/// Takes the scene to another folder: what its nodes name by a relative path that leads to something today is named
/// such that it leads there from `folder`, which becomes the scene's. What names nothing stays as it is written.
/// Thread: main.
class Rebasing {
public:
    /// `folder` absolute. Adds a warning for each text that could not be changed: it is locked, or connected.
    Rebasing(const std::filesystem::path& folder, Warnings& warnings);
    /// Puts every text and the folder back as they were.
    void undo();

private:
    std::filesystem::path folderBefore_; ///< empty for a scene without a file
    std::vector<Relocation> before_;
};

} // namespace OpenQuarn
