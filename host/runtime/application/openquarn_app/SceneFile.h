// SPDX-License-Identifier: Apache-2.0
// Scene files: opening, saving, looking into them, and the files that a scene needs besides.
#pragma once

#include "openquarn/HApi.h"

#include <cstdint>
#include <filesystem>
#include <functional>
#include <map>
#include <string>
#include <vector>

namespace OpenQuarn {

// Paths that are not absolute count as Workspace.h says.

/// What became of an operation on files. Warnings say what could not be done although the rest was; the error, why
/// nothing was. All of them begin with the file's name. Warnings have gone to the message sink as well, one about a
/// number that setAttr would refuse as an error; the error is the caller's to show.
struct FileOutcome {
    bool ok = false;
    std::string error; ///< empty when ok
    std::vector<std::string> warnings;
    explicit operator bool() const { return ok; }
};

/// Replaces the scene by the one in the file, which becomes the current file. A file that cannot be read or is no scene
/// file is an error, with line and column where it is malformed, and the present scene stays as it is. Everything else
/// that cannot be understood - node types that are not registered, unknown keys, values that do not fit, connections
/// with an unknown end - is a warning, is kept, and is written again by saveScene(). So is a number that setAttr would
/// refuse: not finite, not whole, out of range; one beyond a hard limit becomes the limit, with a warning. Linear in
/// the size of the file. Thread: main.
OPENQUARN_API FileOutcome openScene(const std::filesystem::path& path);

/// Writes the scene, which makes `path` the current file. The file is replaced as a whole or, on an error, not at all;
/// a new one gets the permissions of the one it replaces. In another folder than before, what the nodes name by a
/// relative path and is there (externalContent()) is named anew; on an error every text is what it was. Thread: main.
OPENQUARN_API FileOutcome saveScene(const std::filesystem::path& path);

/// Does the same renaming before the scene is saved, for an application that has more files to name: from now on the
/// scene's texts count from `folder`, which is absolute. The current file stays. Thread: main.
OPENQUARN_API FileOutcome moveScene(const std::filesystem::path& folder);

/// How a scene in `folder` names `file`, both absolute: relative when the file lies in that folder or below it, so that
/// the folder can be moved; absolute otherwise. By text alone. Throws std::runtime_error when no scene can name it:
/// what looks like a variable of the environment ($NAME, ${NAME}) would be replaced. Thread: any.
OPENQUARN_API std::string pathForScene(const std::filesystem::path& file, const std::filesystem::path& folder);

/// Called with the folder that texts of the scene count from, absolute, whenever that may have become another one;
/// empty for a scene without a file. An application whose nodes open files by relative paths of the system makes it the
/// current directory, as a library must not. A folder that does not exist yet is told of again when saving has made it.
/// Called on the main thread; must not throw.
using SceneFolderSink = std::function<void(const std::filesystem::path& folder)>;

/// From now on `sink` is called, or none when it is empty. Returns the one of before. Thread: main.
OPENQUARN_API SceneFolderSink setSceneFolderSink(SceneFolderSink sink);

/// The scene as saveScene() writes it, and a scene read from such a text; the current file stays as it is. `fileName`
/// names the text in messages. Thread: main.
OPENQUARN_API FileOutcome sceneFromText(const std::string& text, const std::string& fileName);
OPENQUARN_API FileOutcome sceneToText(std::string& text);

/// Path of the scene's file as it was given; empty for a scene that has none. Thread: any.
OPENQUARN_API std::string currentFile();

/// What a scene file holds, found without opening it.
struct SceneSummary {
    FileOutcome outcome; ///< the members below are meaningful when it is ok
    int version = 0;     ///< of the format
    std::string writtenBy;
    std::uintmax_t bytes = 0;
    double time = 1.0;
    std::size_t nodes = 0;
    std::size_t connections = 0;
    std::map<std::string, std::size_t> nodesByType; ///< a node without a type counts under ""
    std::vector<std::string> plugins;               ///< that the file says it needs
    std::vector<std::string> missingTypes;          ///< not registered at the moment; sorted
};

/// Reads the summary of a file; the scene is not touched, and no session is needed. Thread: main.
OPENQUARN_API SceneSummary readSummary(const std::filesystem::path& path);

/// The files and folders that the nodes need besides the scene file, each once, in order of nodes. `unresolved` asks
/// for the paths as they are written in the nodes. Thread: main.
OPENQUARN_API std::vector<std::string> filesToArchive(bool unresolved = false);

/// One thing outside of the scene file that a node reads.
struct ExternalContent {
    std::string node;
    std::string key;        ///< names it within its node
    std::string unresolved; ///< path as it is written
    std::string resolved;   ///< path that is read; empty when it has not been resolved
    std::string role;
    bool isResolved = false;
};

/// Role of a path that stands for several files: something in its last component, in "{}", is another text in each.
inline constexpr const char* filePatternRole = "file pattern";

/// All of it, in order of nodes. Thread: main.
OPENQUARN_API std::vector<ExternalContent> externalContent();

/// A new place for the thing `key` of a node.
struct Relocation {
    std::string node;
    std::string key;
    std::string location;
};

/// Hands the nodes their new places. A row whose node or key does not exist, or that stands twice, is a warning, and
/// the others are done all the same; an error only when there is no scene. Thread: main.
OPENQUARN_API FileOutcome relocate(const std::vector<Relocation>& table);

} // namespace OpenQuarn
