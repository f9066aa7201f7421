// SPDX-License-Identifier: Apache-2.0
// The folders that paths count from which are not absolute: the caller's, and the root of the workspace.
//
// There is one rule. A text inside a scene counts from the folder of the scene's file, and while the scene has no file
// from the caller's folder; an argument of a command or of a function of the application's interface counts from the
// caller's folder, whatever scene is open.
#pragma once

#include "openquarn/HApi.h"

#include <filesystem>
#include <string>

namespace OpenQuarn {

/// Thread: any.
class OPENQUARN_API Workspace {
public:
    Workspace() = delete;

    /// The folder from which the application was called: what was set, or else the current directory of the process as
    /// it is at the moment ("" when there is none). An application that changes its current directory sets it first.
    static std::filesystem::path callersFolder();
    /// `folder` absolute; empty for the current directory again.
    static void setCallersFolder(std::filesystem::path folder);
    /// The file that an argument names. A path stays as it is written when it is empty or absolute, and while no
    /// caller's folder is set.
    static std::filesystem::path callersPath(const std::filesystem::path& path);

    /// Root directory, exactly as it was set; the caller's folder, with a "/" at its end, until then.
    static std::string rootDirectory();
    /// Any text is taken; paths are joined to it with a "/" where it does not end in one.
    static void setRootDirectory(std::string root);
    /// Goes back to the caller's folder.
    static void resetRootDirectory() noexcept;
};

} // namespace OpenQuarn
