// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnPlugin.h"

#include "core/apiCall.h"
#include "core/text.h"
#include "plugins/Library.h"
#include "plugins/Plugin.h"
#include "types/baseNodes.h"

#include <filesystem>
#include <string_view>

using OpenQuarn::apiCall;
using OpenQuarn::isRefused;
using OpenQuarn::Operation;
using OpenQuarn::Plugin;
using OpenQuarn::Registration;

namespace {

std::shared_ptr<Plugin> pluginOf(const HFnBase& set) {
    return OpenQuarn::Access::as<Plugin>(set.object());
}

/// Wraps an operation on the attached plug-in.
template <class Body>
HStatus pluginCall(const HFnBase& set, Operation point, Body&& body) {
    return apiCall(point, [&]() -> HStatus {
        const std::shared_ptr<Plugin> plugin = pluginOf(set);
        if (!plugin)
            return {HStatus::kInvalidParameter, "the function set is attached to no plug-in"};
        return body(*plugin);
    });
}

/// Null too when the function may not be called on this thread.
std::shared_ptr<Plugin> readablePlugin(const HFnBase& set, Operation operation) {
    return isRefused(operation) ? nullptr : pluginOf(set);
}

HStatus unusable(const HString& name, const HTypeId& id, const char* what) {
    return {HStatus::kInvalidParameter,
            std::string(what) + ": '" + name.asStdString() + "', " + OpenQuarn::hexText(id)};
}

} // namespace

HFnPlugin::HFnPlugin(const HObject& plugin, const char* vendor, const char* version, const char* requiredApiVersion,
                     HStatus* status) {
    const std::string required = requiredApiVersion ? requiredApiVersion : "Any";
    HStatus outcome = setObject(plugin);
    if (!outcome.error() && required != "Any" && !OpenQuarn::servesApiVersion(required)) {
        outcome = {HStatus::kFailure, "the plug-in requires version '" + required +
                                          "' of the H-API, and this host has " + OpenQuarn::hostApiVersion()};
        object_ = HObject::kNullObj;
    }
    if (const std::shared_ptr<Plugin> attached = pluginOf(*this))
        attached->introduce(vendor ? vendor : "Unknown", version ? version : "Unknown");
    if (status)
        *status = outcome;
}

HFnPlugin::~HFnPlugin() = default;

HString HFnPlugin::name() const {
    const std::shared_ptr<Plugin> plugin = readablePlugin(*this, Operation::HFnPlugin_name);
    return plugin ? HString(plugin->name) : HString();
}
HString HFnPlugin::vendor() const {
    const std::shared_ptr<Plugin> plugin = readablePlugin(*this, Operation::HFnPlugin_vendor);
    return plugin ? HString(plugin->vendor()) : HString();
}
HString HFnPlugin::version() const {
    const std::shared_ptr<Plugin> plugin = readablePlugin(*this, Operation::HFnPlugin_version);
    return plugin ? HString(plugin->version()) : HString();
}
HString HFnPlugin::apiVersion() const {
    const std::shared_ptr<Plugin> plugin = readablePlugin(*this, Operation::HFnPlugin_apiVersion);
    return plugin ? HString(plugin->apiVersion) : HString();
}
HString HFnPlugin::loadPath() const {
    const std::shared_ptr<Plugin> plugin = readablePlugin(*this, Operation::HFnPlugin_loadPath);
    return plugin ? HString(std::filesystem::path(plugin->path).parent_path().string()) : HString();
}

HStatus HFnPlugin::registerNode(const HString& typeName, const HTypeId& id, HPxNode* (*creator)(),
                                HStatus (*initializer)(), HPxNode::Type type) {
    return pluginCall(*this, Operation::HFnPlugin_registerNode, [&](Plugin& plugin) -> HStatus {
        if (!OpenQuarn::isIdentifier(typeName.asStdString()) || id.id() == 0 || !creator)
            return unusable(typeName, id, "a node type needs an identifier for its name, an id and a creator");
        if (!OpenQuarn::hasBaseClass(type))
            return unusable(typeName, id, "there is no such kind of node types");
        plugin.registerNode(typeName.asStdString(), id, creator, initializer, type);
        return HStatus::kSuccess;
    });
}

HStatus HFnPlugin::deregisterNode(const HTypeId& id) {
    return pluginCall(*this, Operation::HFnPlugin_deregisterNode, [&](Plugin& plugin) -> HStatus {
        plugin.deregister(Registration::Kind::node, id);
        return HStatus::kSuccess;
    });
}

HStatus HFnPlugin::registerData(const HString& typeName, const HTypeId& id, HPxData* (*creator)(), HPxData::Type type) {
    return pluginCall(*this, Operation::HFnPlugin_registerData, [&](Plugin& plugin) -> HStatus {
        if (typeName.isEmpty() || id.id() == 0 || !creator || type != HPxData::kData)
            return unusable(typeName, id, "a data type needs a name, an id, a creator and the kind kData");
        plugin.registerData(typeName.asStdString(), id, creator);
        return HStatus::kSuccess;
    });
}

HStatus HFnPlugin::deregisterData(const HTypeId& id) {
    return pluginCall(*this, Operation::HFnPlugin_deregisterData, [&](Plugin& plugin) -> HStatus {
        plugin.deregister(Registration::Kind::data, id);
        return HStatus::kSuccess;
    });
}

HStatus HFnPlugin::registerCommand(const HString& name, HPxCommand* (*creator)(), HSyntax (*syntax)()) {
    return pluginCall(*this, Operation::HFnPlugin_registerCommand, [&](Plugin& plugin) -> HStatus {
        return plugin.registerCommand(name.asStdString(), creator, syntax);
    });
}

HStatus HFnPlugin::deregisterCommand(const HString& name) {
    return pluginCall(*this, Operation::HFnPlugin_deregisterCommand, [&](Plugin& plugin) -> HStatus {
        plugin.deregister(Registration::Kind::command, name.asStdString());
        return HStatus::kSuccess;
    });
}

HStatus HFnPlugin::registerUIStrings(HStatus (*registrar)(), const HString& resourceFile) {
    return pluginCall(*this, Operation::HFnPlugin_registerUIStrings, [&](Plugin&) -> HStatus {
        if (!registrar || !resourceFile.isEmpty())
            return {HStatus::kInvalidParameter,
                    "texts are registered by a function, and from no file: '" + resourceFile.asStdString() + "'"};
        return registrar();
    });
}
