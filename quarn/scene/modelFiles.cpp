// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/modelFiles.h"

#include "nw_model/PrincipalShapes.h"

#include <algorithm>

namespace quarn {

namespace fs = std::filesystem;
using neuralWarp::ModelMetadata;
using neuralWarp::SubsetState;

void readMetadata(const fs::path& directory, ModelMetadata& metadata, std::vector<std::string>& problems) {
    const fs::path file = directory / "metadata.json";
    if (!fs::exists(file))
        problems.emplace_back("metadata.json is missing: the deformer ignores the model without a word");
    else if (!neuralWarp::readMetadataFile(metadata, file))
        problems.emplace_back("metadata.json is no JSON object that can be read");
    if (!metadata.loaded)
        return;
    if (metadata.subsetState == SubsetState::Unrecognized)
        problems.emplace_back("metadata.json has no subsetState that is known: the model drives no vertex");
    if (metadata.deltaMode > 1)
        problems.push_back("metadata.json has the deltaMode " + std::to_string(metadata.deltaMode) +
                           ": 0 (Offset) and 1 (Surface) are known");
    const auto& map = metadata.affectMap;
    const auto beyond = std::find_if(map.begin(), map.end(), [&](auto vertex) { return vertex >= metadata.fullCount; });
    if (beyond != map.end())
        problems.push_back("metadata.json drives vertex " + std::to_string(*beyond) + ", and its mesh has " +
                           std::to_string(metadata.fullCount) + " vertices");
}

ShapeSizes readShapeSizes(const fs::path& directory, std::vector<std::string>& problems) {
    const fs::path file = directory / "principal_shapes.json";
    ShapeSizes sizes;
    sizes.hasFile = fs::exists(file);
    std::vector<float> values;
    if (sizes.hasFile && !neuralWarp::readPrincipalShapesFile(file, values, sizes.count, sizes.vertices))
        problems.emplace_back("principal_shapes.json is damaged: the deformer would take the network's outputs "
                              "for deltas");
    return sizes;
}

} // namespace quarn
