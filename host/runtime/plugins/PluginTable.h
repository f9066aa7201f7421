// SPDX-License-Identifier: Apache-2.0
// The plug-ins that are loaded.
#pragma once

#include "openquarn_app/Plugins.h"
#include "plugins/Library.h"
#include "plugins/Plugin.h"

#include <memory>
#include <string>
#include <vector>

namespace OpenQuarn {

/// Thread: main. What can fail throws std::invalid_argument or std::runtime_error with a sentence.
class PluginTable {
public:
    static PluginTable& instance();

    /// Returns the name. Does nothing when the file is loaded.
    std::string load(const std::string& path);
    void addInProcess(const std::string& name, PluginEntryPoint initialize, PluginEntryPoint uninitialize);
    void unload(const std::string& name);
    /// Last loaded first; whatever fails becomes a warning, and what still uses them is no reason to keep them.
    void unloadAll() noexcept;

    /// Null when there is none.
    std::shared_ptr<Plugin> find(const std::string& name) const;
    /// In order of loading.
    std::vector<std::shared_ptr<Plugin>> all() const;
    /// The plug-in whose entry point is running; null when none is.
    Plugin* active() const { return active_; }

private:
    struct Loaded {
        std::shared_ptr<Plugin> plugin;
        std::unique_ptr<Library> library; ///< null for a plug-in of the application
        PluginEntryPoint initialize;
        PluginEntryPoint uninitialize;
    };
    using Place = std::vector<Loaded>::iterator;

    Place placeOf(const std::string& name);
    void refuseTaken(const std::string& name, const std::string& path) const;
    void start(Loaded loaded);
    void retire(Loaded& loaded) const;
    void haveItUninitialize(const Loaded& loaded);
    HStatus call(const Loaded& loaded, PluginEntryPoint entry, const char* name);
    static void refuseInUse(const Plugin& plugin);

    std::vector<Loaded> loaded_;
    Plugin* active_ = nullptr;
};

} // namespace OpenQuarn
