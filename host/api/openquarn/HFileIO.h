// SPDX-License-Identifier: Apache-2.0
// The scene file.
#pragma once

#include "openquarn/HString.h"

class OPENQUARN_API HFileIO {
public:
    HFileIO() = delete;

    /// Version of the format of the scene file that is being read at the moment, 0 or more; -1 when none is. A node
    /// that is made while this is 0 or more will receive its stored values, and sets no values of its own. [any]
    static int currentlyReadingFileVersion() noexcept;

    /// Path of the scene file, as it was given when the scene was read or written last; empty for a scene that has no
    /// file yet. [any]
    static HString currentFile();
};
