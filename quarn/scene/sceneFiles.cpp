// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/sceneFiles.h"

#include "quarn/scene/plugs.h"

#include "openquarn_app/SceneFile.h"
#include "storage/FileIdentity.h"
#include "storage/Fnv64.h"

#include <fstream>
#include <span>
#include <stdexcept>
#include <vector>

namespace quarn {
namespace {

std::string stateOfFile(const std::string& path) {
    const auto identity = storage::identityOf(path);
    if (!identity)
        return "(not there)";
    return std::to_string(identity->size) + " bytes of " + std::to_string(identity->seconds) + " s " +
           std::to_string(identity->nanoseconds) + " ns";
}

} // namespace

std::string sumOfFile(const std::filesystem::path& path) {
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

void addSceneFiles(Setup& setup, ReadFiles which) {
    for (const OpenQuarn::ExternalContent& file : OpenQuarn::externalContent()) {
        const std::string path = file.resolved.empty() ? file.unresolved : file.resolved;
        if (path.empty() || file.role == OpenQuarn::filePatternRole)
            continue;
        if (which == ReadFiles::all || nodeType(findNode(file.node)) != "neuralWarp")
            setup.add("file " + file.unresolved + " of " + file.node + "." + file.key, stateOfFile(path));
    }
}

} // namespace quarn
