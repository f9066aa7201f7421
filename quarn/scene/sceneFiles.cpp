// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/sceneFiles.h"

#include "quarn/scene/Warp.h"
#include "quarn/scene/modelDirectory.h"
#include "quarn/scene/plugs.h"

#include "openquarn_app/SceneFile.h"
#include "storage/FileIdentity.h"
#include "storage/Fnv64.h"

#include <algorithm>
#include <fstream>
#include <span>
#include <stdexcept>
#include <system_error>
#include <vector>

namespace quarn {

namespace fs = std::filesystem;

namespace {

std::string stateOfFile(const std::string& path) {
    const auto identity = storage::identityOf(path);
    if (!identity)
        return "(not there)";
    return std::to_string(identity->size) + " bytes of " + std::to_string(identity->seconds) + " s " +
           std::to_string(identity->nanoseconds) + " ns";
}

} // namespace

std::string sumOfFile(const fs::path& path) {
    std::ifstream file(path, std::ios::binary);
    std::vector<char> block(1U << 18U);
    storage::Fnv64 sum;
    while (file) {
        file.read(block.data(), static_cast<std::streamsize>(block.size()));
        sum.add(std::as_bytes(std::span(block).first(static_cast<std::size_t>(file.gcount()))));
    }
    if (!file.eof())
        throw std::runtime_error(path.string() + " could not be read");
    return sum.text();
}

std::vector<SceneFile> sceneFiles() {
    std::vector<SceneFile> files;
    for (const OpenQuarn::ExternalContent& file : OpenQuarn::externalContent()) {
        const std::string& path = file.resolved.empty() ? file.unresolved : file.resolved;
        if (!path.empty() && file.role != OpenQuarn::filePatternRole && nodeType(findNode(file.node)) != "neuralWarp")
            files.push_back({file.node, file.key, file.unresolved, fs::absolute(path).lexically_normal()});
    }
    return files;
}

std::vector<SceneFile> filesOfModel(const Warp& warp, const WarpGeometry& geometry) {
    const HPlug active = warp.plug("models", geometry, "modelActive");
    const fs::path directory = modelDirectory(warp, geometry);
    if (directory.empty() || (!isModelActive(warp, geometry) && active.source().isNull()))
        return {};
    const std::string key = "models[" + std::to_string(geometry.index) + "]";
    const fs::path place = fs::absolute(directory).lexically_normal();
    std::vector<SceneFile> files;
    std::error_code error;
    for (fs::directory_iterator entry(place, error), end; !error && entry != end; entry.increment(error))
        if (entry->is_regular_file(error))
            files.push_back({warp.name, key, (directory / entry->path().filename()).string(), entry->path()});
    if (files.empty())
        return {{warp.name, key, directory.string(), place}};
    std::sort(files.begin(), files.end(), [](const SceneFile& a, const SceneFile& b) { return a.path < b.path; });
    return files;
}

void addFiles(Setup& setup, const std::vector<SceneFile>& files) {
    for (const SceneFile& file : files)
        setup.add("file " + file.name + " of " + file.node + "." + file.key, stateOfFile(file.path));
}

} // namespace quarn
