// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/vertexMap.h"

#include "storage/npyArray.h"

namespace quarn {

void writeVertexMap(const std::filesystem::path& path, const std::vector<std::uint32_t>& sceneVertexOf) {
    storage::writeIntegers(path, std::vector<std::int32_t>(sceneVertexOf.begin(), sceneVertexOf.end()));
}

} // namespace quarn
