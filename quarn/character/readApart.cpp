// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/readApart.h"

#include "quarn/process/runApart.h"
#include "storage/FileError.h"
#include "storage/Json.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <cctype>
#include <filesystem>
#include <stdexcept>

namespace quarn {

std::string lowerEnding(const std::string& path) {
    std::string ending = std::filesystem::path(path).extension().string();
    std::transform(ending.begin(), ending.end(), ending.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return ending;
}

bool isGltf(const std::string& ending) {
    return ending == ".gltf" || ending == ".glb";
}

std::string readCharacterBytes(const std::string& path) {
    try {
        std::string bytes = storage::readWholeFile(path, storage::jsonRules::character.mostBytes);
        if (bytes.empty())
            throw std::runtime_error("the file is empty");
        return bytes;
    } catch (const storage::FileError& error) {
        throw std::runtime_error(error.predicate()); // the path is put before every error
    }
}

std::string importApart(const std::function<std::string()>& action) {
    try {
        return runApart(action);
    } catch (const NoAnswer& none) {
        throw std::runtime_error(none.why() == NoAnswer::Why::crashed
                                     ? "the file is damaged: the importer does not survive it"
                                     : std::string("reading the file ") + none.what());
    }
}

} // namespace quarn
