// SPDX-License-Identifier: Apache-2.0
// The folder of what the host reads at run time.
#pragma once

#include "openquarn/HApi.h"

#include <filesystem>
#include <string>

namespace OpenQuarn {

/// What HGlobal::getAbsolutePathToResources answers. Thread: any.
class OPENQUARN_API Resources {
public:
    Resources() = delete;

    /// Absolute, without a separator at its end. Until it is set: "resources" in the folder of the host library, where
    /// that exists (a build folder), else "share/OpenQuarn" beside the folder of the library (an installed tree).
    static std::string path();
    /// A relative path counts from the caller's folder (Workspace.h). An empty one brings back the folder of the start.
    static void setPath(const std::filesystem::path& path);
};

} // namespace OpenQuarn
