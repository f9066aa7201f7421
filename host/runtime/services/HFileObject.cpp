// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFileObject.h"

#include "openquarn_app/Workspace.h"
#include "services/SceneFileState.h"
#include "services/paths.h"

#include <filesystem>
#include <utility>
#include <vector>

namespace {

/// Where texts of the scene count from.
std::string baseFolder() {
    std::string scene = OpenQuarn::currentSceneFolder();
    return scene.empty() ? OpenQuarn::Workspace::callersPath(OpenQuarn::Workspace::rootDirectory()).string() : scene;
}

/// The places to look for a path in, in their order.
std::vector<std::string> placesOf(const std::string& path, int method) {
    if (OpenQuarn::isAbsolutePath(path))
        return {path};
    std::vector<std::string> places;
    if (method & HFileObject::kSceneFolder)
        places.push_back(OpenQuarn::joinPath(baseFolder(), path));
    if (method & HFileObject::kAsWritten)
        places.push_back(path);
    return places;
}

std::string missingPath(const std::string& path, int method) {
    if (!(method & HFileObject::kKeepMissing))
        return {};
    return OpenQuarn::isAbsolutePath(path) ? path : OpenQuarn::joinPath(baseFolder(), path);
}

std::string resolve(const std::string& path, int method) {
    for (std::string& place : placesOf(path, method))
        if (OpenQuarn::pathExists(place))
            return std::move(place);
    return missingPath(path, method);
}

} // namespace

HString HFileObject::expandedFullName() const {
    return HString(OpenQuarn::expandPath(rawFullName_.asStdString()));
}

HString HFileObject::resolvedFullName() const {
    if (rawFullName_.isEmpty())
        return {};
    const HString path = (method_ & kExpand) ? expandedFullName() : rawFullName_;
    std::string resolved = resolve(path.asStdString(), method_);
    if (method_ & kNormalize)
        resolved = std::filesystem::path(resolved).lexically_normal().string();
    return HString(std::move(resolved));
}

bool HFileObject::exists() const {
    return OpenQuarn::pathExists(resolvedFullName().asStdString());
}
