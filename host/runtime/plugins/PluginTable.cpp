// SPDX-License-Identifier: Apache-2.0
#include "plugins/PluginTable.h"

#include "commands/CommandRegistry.h"
#include "core/apiCall.h"
#include "graph/Graph.h"
#include "openquarn_app/Messages.h"
#include "openquarn_app/Workspace.h"

#include <algorithm>
#include <filesystem>
#include <stdexcept>

namespace OpenQuarn {
namespace {

namespace fs = std::filesystem;

fs::path existingFile(const std::string& path) {
    std::error_code error;
    fs::path whole = fs::canonical(Workspace::callersPath(path), error);
    if (error)
        throw std::runtime_error("there is no such file: " + error.message());
    if (!fs::is_regular_file(whole, error))
        throw std::runtime_error("it is not a file");
    return whole;
}

PluginEntryPoint entryPoint(const Library& library, const char* name) {
    return reinterpret_cast<PluginEntryPoint>(library.symbol(name));
}

std::size_t removeCallbacksInto(const Library& library) {
    std::vector<HCallbackId> found;
    for (const Graph* graph : Graph::all())
        for (const std::shared_ptr<Node>& node : graph->nodes())
            for (const Node::Callback& callback : node->callbacks)
                if (library.contains(reinterpret_cast<const void*>(callback.function)))
                    found.push_back(callback.id);
    for (const HCallbackId id : found)
        removeCallback(id);
    return found.size();
}

[[noreturn]] void refuseLoading(const std::string& what, const std::string& why) {
    throw std::runtime_error("plug-in '" + what + "' cannot be loaded: " + why);
}

} // namespace

PluginTable& PluginTable::instance() {
    static PluginTable table;
    return table;
}

PluginTable::Place PluginTable::placeOf(const std::string& name) {
    return std::find_if(loaded_.begin(), loaded_.end(),
                        [&](const Loaded& loaded) { return loaded.plugin->name == name; });
}

std::shared_ptr<Plugin> PluginTable::find(const std::string& name) const {
    for (const Loaded& loaded : loaded_)
        if (loaded.plugin->name == name)
            return loaded.plugin;
    return nullptr;
}

std::vector<std::shared_ptr<Plugin>> PluginTable::all() const {
    std::vector<std::shared_ptr<Plugin>> plugins;
    plugins.reserve(loaded_.size());
    for (const Loaded& loaded : loaded_)
        plugins.push_back(loaded.plugin);
    return plugins;
}

void PluginTable::refuseTaken(const std::string& name, const std::string& path) const {
    const std::shared_ptr<Plugin> present = find(name);
    if (present && !present->takenBack().empty())
        throw std::runtime_error("a plug-in named '" + name + "' is half unloaded, without " +
                                 describe(present->takenBack()) + ": unload it again first");
    if (present)
        throw std::runtime_error("a plug-in named '" + name + "' is loaded already, " +
                                 (present->path.empty() ? "as part of the application" : "from " + present->path) +
                                 (path.empty() ? "" : "; unload it first"));
    if (active_ && active_->name == name)
        throw std::runtime_error("a plug-in named '" + name + "' is being loaded or unloaded");
}

std::string PluginTable::load(const std::string& path) {
    try {
        const fs::path whole = existingFile(path);
        std::string name = whole.stem().string();
        const std::shared_ptr<Plugin> present = find(name);
        if (present && present->path == whole.string() && present->takenBack().empty())
            return name;
        refuseTaken(name, whole.string());
        Loaded loaded;
        loaded.library = std::make_unique<Library>(whole.string());
        const std::string builtFor = checkedApiVersion(static_cast<const char*>(loaded.library->symbol("HApiVersion")));
        loaded.initialize = entryPoint(*loaded.library, "initializePlugin");
        loaded.uninitialize = entryPoint(*loaded.library, "uninitializePlugin");
        loaded.plugin = std::make_shared<Plugin>(name, whole.string(), builtFor);
        start(std::move(loaded));
        return name;
    } catch (const std::exception& error) {
        refuseLoading(path, error.what());
    }
}

void PluginTable::addInProcess(const std::string& name, PluginEntryPoint initialize, PluginEntryPoint uninitialize) {
    try {
        if (name.empty() || !initialize || !uninitialize)
            throw std::invalid_argument("it needs a name and two functions");
        refuseTaken(name, {});
        start({std::make_shared<Plugin>(name, std::string(), hostApiVersion()), nullptr, initialize, uninitialize});
    } catch (const std::exception& error) {
        refuseLoading(name, error.what());
    }
}

HStatus PluginTable::call(const Loaded& loaded, PluginEntryPoint entry, const char* name) {
    Plugin* const previous = std::exchange(active_, loaded.plugin.get());
    HStatus status;
    try {
        status = entry(Access::object(loaded.plugin));
    } catch (...) {
        status = statusOfException(name);
    }
    active_ = previous;
    return status;
}

void PluginTable::start(Loaded loaded) {
    currentGraph(); // throws when there is no session, and the host's own types with it
    loaded_.reserve(loaded_.size() + 1);
    const HStatus status = call(loaded, loaded.initialize, "initializePlugin");
    if (status.error()) {
        const std::string why = "initializePlugin failed: " + status.errorString().asStdString();
        loaded.plugin->removeAll();
        retire(loaded);
        throw std::runtime_error(why);
    }
    loaded_.push_back(std::move(loaded));
}

// The last step: nothing of the host leads into the plug-in any more, or its library stays where it is.
void PluginTable::retire(Loaded& loaded) const {
    const std::string name = "plug-in '" + loaded.plugin->name + "'";
    loaded.plugin->bury();
    if (!loaded.library)
        return;
    if (const std::size_t callbacks = removeCallbacksInto(*loaded.library))
        showMessage(Severity::warning,
                    name + " left " + std::to_string(callbacks) + " callbacks on nodes, which the host took away");
    const std::string users = loaded.plugin->users();
    if (!users.empty()) {
        showMessage(Severity::warning, "the library of " + name + " stays mapped: there are still " + users);
        loaded.library->keep();
    } else if (!loaded.library->close()) {
        showMessage(Severity::warning,
                    "the library of " + name +
                        " stays mapped, and loading it again will not see a "
                        "changed file: it was not built with openquarn_plugin(), or is in use elsewhere");
    }
}

void PluginTable::refuseInUse(const Plugin& plugin) {
    const std::string users = plugin.users();
    if (!users.empty())
        throw std::runtime_error("there are still " + users);
    if (CommandRegistry::instance().isRunning(&plugin))
        throw std::runtime_error("one of its commands is running");
}

// What it has taken back before a failing step stays so: a second time counts as done.
void PluginTable::haveItUninitialize(const Loaded& loaded) {
    const std::shared_ptr<Plugin> plugin = loaded.plugin; // the entry may move when it loads another
    const std::vector<Registration> before = plugin->registrations();
    const HStatus status = call(loaded, loaded.uninitialize, "uninitializePlugin");
    if (!status.error())
        return;
    plugin->unloadFailed(before);
    const std::string gone = describe(plugin->takenBack());
    throw std::runtime_error("uninitializePlugin failed, and it stays loaded" +
                             (gone.empty() ? gone : " without " + gone + ", until it is unloaded again") + ": " +
                             status.errorString().asStdString());
}

void PluginTable::unload(const std::string& name) {
    const auto place = placeOf(name);
    if (place == loaded_.end())
        throw std::runtime_error("no plug-in named '" + name + "' is loaded");
    try {
        if (active_)
            throw std::runtime_error("plug-in '" + active_->name + "' is being loaded or unloaded");
        refuseInUse(*place->plugin);
        haveItUninitialize(*place);
    } catch (const std::exception& error) {
        throw std::runtime_error("plug-in '" + name + "' cannot be unloaded: " + error.what());
    }
    const auto now = placeOf(name); // it may have loaded another meanwhile
    Loaded loaded = std::move(*now);
    loaded_.erase(now);
    const std::vector<Registration> left = loaded.plugin->removeAll();
    if (!left.empty())
        showMessage(Severity::warning,
                    "plug-in '" + name + "' left registered, and the host took away: " + describe(left));
    retire(loaded);
}

void PluginTable::unloadAll() noexcept {
    while (!loaded_.empty()) {
        try {
            Loaded loaded = std::move(loaded_.back());
            loaded_.pop_back();
            const HStatus status = call(loaded, loaded.uninitialize, "uninitializePlugin");
            if (status.error())
                showMessage(Severity::warning, "plug-in '" + loaded.plugin->name + "': uninitializePlugin failed: " +
                                                   status.errorString().asStdString());
            loaded.plugin->removeAll();
            retire(loaded);
        } catch (const std::exception& error) {
            showMessage(Severity::warning, error.what());
        }
    }
}

// --- what applications see ---

std::string loadPlugin(const std::string& path) {
    return PluginTable::instance().load(path);
}

void addPlugin(const std::string& name, PluginEntryPoint initialize, PluginEntryPoint uninitialize) {
    PluginTable::instance().addInProcess(name, initialize, uninitialize);
}

void unloadPlugin(const std::string& name) {
    PluginTable::instance().unload(name);
}

std::vector<std::string> loadedPlugins() {
    std::vector<std::string> names;
    const std::vector<std::shared_ptr<Plugin>> plugins = PluginTable::instance().all();
    names.reserve(plugins.size());
    for (const std::shared_ptr<Plugin>& plugin : plugins)
        names.push_back(plugin->name);
    return names;
}

PluginInfo pluginInfo(const std::string& name) {
    const std::shared_ptr<Plugin> plugin = PluginTable::instance().find(name);
    if (!plugin)
        throw std::runtime_error("no plug-in named '" + name + "' is loaded");
    PluginInfo info{name, plugin->path, plugin->vendor(), plugin->version(), plugin->apiVersion, {}, {}, {}, {}};
    std::vector<std::string>* const lists[] = {&info.nodeTypes, &info.dataTypes, &info.commands, &info.gpuDeformers};
    for (const Registration& registration : plugin->registrations())
        lists[static_cast<int>(registration.kind)]->push_back(registration.name);
    return info;
}

} // namespace OpenQuarn
