// SPDX-License-Identifier: Apache-2.0
// A path as the user wrote it, and the file or folder that it stands for.
#pragma once

#include "openquarn/HString.h"

/// Turns a raw path into a full one. It holds texts only, and looks at the disk at each call that says so. Paths are
/// separated by "/". One object is for one thread at a time.
class OPENQUARN_API HFileObject {
public:
    /// What resolving does: a sum of these, worked through from top to bottom. Other bits mean nothing and do no harm.
    enum ResolveMethod : int {
        kNormalize = 1,    ///< Takes "." , ".." and doubled separators out of the result, by text alone.
        kExpand = 2,       ///< Replaces a leading "~" and variables first; see expandedFullName().
        kSceneFolder = 4,  ///< Looks for a relative path in the folder of the current scene file; while the scene has
                           ///< no file, below the root directory of the workspace,
        kAsWritten = 16,   ///< then as it stands: relative to the process's current directory.
        kKeepMissing = 32, ///< When nothing exists, gives the path as kSceneFolder takes it; otherwise gives "".
        kDefault = kExpand | kSceneFolder | kAsWritten | kKeepMissing, ///< 54
    };

    /// The path as it is written; copied. Need not exist, may be empty. [any]
    void setRawFullName(const HString& path) { rawFullName_ = path; }
    /// The path as it was set. [any]
    const HString& rawFullName() const noexcept { return rawFullName_; }

    /// A sum of ResolveMethod; kDefault until it is set. [any]
    void setResolveMethod(int method) noexcept { method_ = method; }
    int resolveMethod() const noexcept { return method_; }

    /// The raw path, with a leading "~" (alone or before "/") replaced by the home directory and each $NAME and ${NAME}
    /// by that variable of the environment. What is not set stays as it is written, and what a variable holds is not
    /// replaced again. Does not look at the disk. [any]
    HString expandedFullName() const;

    /// The path after resolving. An absolute path is only expanded: it stays where it is, or gives "" when it does not
    /// exist and kKeepMissing is not asked for. The first place that holds an entry wins; a disk that cannot answer
    /// holds none. An empty raw path gives "". [any]
    HString resolvedFullName() const;

    /// True when a file, folder or other entry exists at resolvedFullName(). [any]
    bool exists() const;

private:
    HString rawFullName_;
    int method_ = kDefault;
};
