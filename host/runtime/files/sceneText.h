// SPDX-License-Identifier: Apache-2.0
// The scene as the text of a scene file, and back.
//
// The text is JSON, an object with the keys
//   openquarnScene  version of the format, a whole number; a file without it is no scene file
//   writtenBy       the program that wrote it, for people
//   time            current frame
//   plugins         names of the plug-ins that registered the types of its nodes
//   nodes           in order of creation; each an object with name, type, typeId, plugin (unless the type is the
//                   host's own), values (valueFiles.h) and locked, the names of locked plugs
//   connections     pairs of names, source and destination; of one source in order of connection
// A node's plugin, values and locked, and the file's plugins, are left out when they are empty. Everything else is kept
// as it is; so is what a known key holds that cannot be understood, which then stands a second time under its key: of a
// key that stands twice, the first counts.
#pragma once

#include "files/Warnings.h"
#include "graph/Graph.h"

#include "storage/Json.h"

#include <string>

namespace OpenQuarn {

/// The newest version of the format that this host understands, and the one that it writes.
constexpr int sceneFormatVersion = 1;

/// The keys of a scene file.
namespace SceneKey {
constexpr const char* version = "openquarnScene";
constexpr const char* writtenBy = "writtenBy";
constexpr const char* time = "time";
constexpr const char* plugins = "plugins";
constexpr const char* nodes = "nodes";
constexpr const char* connections = "connections";
constexpr const char* name = "name";
constexpr const char* type = "type";
constexpr const char* typeId = "typeId";
constexpr const char* plugin = "plugin";
constexpr const char* values = "values";
constexpr const char* locked = "locked";
} // namespace SceneKey

std::string writeScene(const Graph& graph, Warnings& warnings);

/// Parses a text that must be a scene file. Throws std::runtime_error saying what is wrong, and where.
storage::JsonDocument parseScene(const std::string& text);
/// The version of a parsed scene file.
int sceneVersion(const storage::JsonDocument& document);

/// Replaces the scene. Plug-ins' callbacks do not run for values; their nodes are told of connections.
void readScene(const storage::JsonDocument& document, Graph& graph, Warnings& warnings);

} // namespace OpenQuarn
