// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/vertexMap.h"

#include "openquarn/HFileObject.h"
#include "quarn/scene/plugs.h"
#include "storage/Fnv64.h"
#include "storage/npyArray.h"

#include <stdexcept>

namespace quarn {
namespace {

// of the scene's character; empty without one
std::string textOfCharacter(const char* attribute) {
    const std::vector<HObject> characters = nodesOfType("character");
    return characters.empty() ? "" : textOf(plugOf(characters.front(), attribute));
}

} // namespace

std::filesystem::path vertexMapFile(const std::string& meshName) {
    std::string path = textOfCharacter("vertexMapFile");
    if (path.empty())
        throw std::runtime_error("the scene does not know the vertices of the file it came from: no node of type "
                                 "character has a vertexMapFile. quarn import sets it; else use --order scene");
    constexpr std::string_view place = "{mesh}";
    if (const std::size_t at = path.find(place); at != std::string::npos)
        path.replace(at, place.size(), meshName);
    HFileObject file;
    file.setResolveMethod(HFileObject::kSceneFolder | HFileObject::kKeepMissing);
    file.setRawFullName(path.c_str());
    return file.resolvedFullName().asStdString();
}

std::string vertexMapDigest(std::span<const std::int32_t> map) {
    storage::Fnv64 sum;
    sum.add(std::as_bytes(map));
    return sum.text();
}

std::vector<std::int32_t> readVertexMap(const std::string& meshName) {
    const std::filesystem::path path = vertexMapFile(meshName);
    std::vector<std::int32_t> map = storage::readIntegers(path);
    const std::string known = textOfCharacter("vertexMapDigests");
    if (!known.empty() && known.find(vertexMapDigest(map)) == std::string::npos)
        throw std::runtime_error(path.string() + " is another vertex map than the scene was imported with: import " +
                                 meshName + " again, or use --order scene");
    return map;
}

} // namespace quarn
