// SPDX-License-Identifier: Apache-2.0
// Files that a character file names, which lie beside it.
#pragma once

#include <string>

namespace quarn {

/// Whether there is a file of that path, and no pipe, device or folder.
bool isFile(const std::string& path);

/// The folder of a path, with its separator; empty where it has none.
std::string folderOf(const std::string& path);

/// The file that a URI in the file `path` names: the one beside it of that name, as it is written or, when there is
/// such a file, with "%20" and the like as the bytes that they stand for.
std::string fileOfUri(const std::string& path, const std::string& uri);

/// The bytes of that file, which is `what` of the file `path`, as "buffer". Throws std::runtime_error with the reason,
/// which names both.
std::string readBeside(const std::string& path, const std::string& uri, const std::string& what);

/// Whether a URI names something that is neither in the folder of its file nor in one below: by an absolute path,
/// "..", a drive or a protocol. Links are followed as they are.
bool leavesFolder(const std::string& uri);

} // namespace quarn
