// SPDX-License-Identifier: Apache-2.0
// Plug-ins: loading them by path, and those that are part of the application itself.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"

#include <string>
#include <vector>

namespace OpenQuarn {

/// An entry point of a plug-in; it gets the plug-in object, for HFnPlugin.
using PluginEntryPoint = HStatus (*)(HObject plugin);

/// What is known of a plug-in. Names in order of registration.
struct PluginInfo {
    std::string name;
    std::string path; ///< absolute, of its file; empty for a plug-in of the application
    std::string vendor;
    std::string version;
    std::string apiVersion; ///< of the H-API that it was built for
    std::vector<std::string> nodeTypes;
    std::vector<std::string> dataTypes;
    std::vector<std::string> commands;
    std::vector<std::string> gpuDeformers; ///< node types that it brings a GPU deformer for
};

/// Loads a shared library and has it register what it offers. Its name is the file's without folder and extension,
/// which is returned. A plug-in that is loaded from this file already is left as it is: a success.
/// Throws std::runtime_error, which says what failed in which file, and leaves nothing of the plug-in behind: no such
/// file, not a library, a symbol missing, built for another version of the H-API, another plug-in of that name,
/// no session, initializePlugin failed or threw, the plug-in is half unloaded. Thread: main.
OPENQUARN_API std::string loadPlugin(const std::string& path);

/// The same for a plug-in that is part of the application. Both functions are called as those of a library are.
/// `name` not empty, and not that of a loaded plug-in. Throws as loadPlugin() does. Thread: main.
OPENQUARN_API void addPlugin(const std::string& name, PluginEntryPoint initialize, PluginEntryPoint uninitialize);

/// Has the plug-in deregister what it offers, and closes its library. What it leaves registered is taken away, with a
/// warning that names it. Throws std::runtime_error, and leaves the plug-in loaded: no plug-in of that name, nodes or
/// data of its types exist, one of its functions is running, uninitializePlugin failed or threw. What
/// uninitializePlugin took back before it failed is gone; the error names it, unloading can be tried again, where
/// taking it back again counts as done, and loading is refused until then. Thread: main.
OPENQUARN_API void unloadPlugin(const std::string& name);

/// Names of all that are loaded, in order of loading. Thread: main.
OPENQUARN_API std::vector<std::string> loadedPlugins();

/// Throws std::runtime_error when there is none of that name. Thread: main.
OPENQUARN_API PluginInfo pluginInfo(const std::string& name);

} // namespace OpenQuarn
