// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/vertexMap.h"

#include "quarn/scene/plugs.h"

#include <stdexcept>

namespace quarn {

std::filesystem::path vertexMapFile(const std::string& meshName) {
    const std::vector<HObject> characters = nodesOfType("character");
    std::string path = characters.empty() ? "" : textOf(plugOf(characters.front(), "vertexMapFile"));
    if (path.empty())
        throw std::runtime_error("the scene does not know the vertices of the file it came from: no node of type "
                                 "character has a vertexMapFile. quarn import sets it; else use --order scene");
    constexpr std::string_view place = "{mesh}";
    if (const std::size_t at = path.find(place); at != std::string::npos)
        path.replace(at, place.size(), meshName);
    return std::filesystem::absolute(path);
}

} // namespace quarn
