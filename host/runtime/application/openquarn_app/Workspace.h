// SPDX-License-Identifier: Apache-2.0
// The folder that the user works in.
#pragma once

#include "openquarn/HApi.h"

#include <string>

namespace OpenQuarn {

/// Thread: any.
class OPENQUARN_API Workspace {
public:
    Workspace() = delete;

    /// Root directory, exactly as it was set; the current directory of the process, with a "/" at its end, until then.
    /// ("" when the process has no current directory.)
    static std::string rootDirectory();
    /// Any text is taken; paths are joined to it with a "/" where it does not end in one.
    static void setRootDirectory(std::string root);
    /// Goes back to the current directory of the process.
    static void resetRootDirectory() noexcept;
};

} // namespace OpenQuarn
