// SPDX-License-Identifier: Apache-2.0
// The readers of the model directory, from any source of bytes. The file readers open their file and call these.
#pragma once

#include <cstdint>
#include <streambuf>
#include <vector>

#include "nw_model/ModelMetadata.h"

namespace neuralWarp {

/// readMetadataFile() on the rest of `source`. May throw; `record` is unchanged then.
bool readMetadata(ModelMetadata& record, std::streambuf& source);

/// Outputs of readPrincipalShapesFile().
struct PrincipalShapes {
    std::vector<float> values;
    std::uint64_t shapeCount = 0;
    std::uint64_t vertCount = 0;
};

/// readPrincipalShapesFile() on the rest of `source`. `shapes` must be fresh. May throw; `shapes` is of no use then.
bool readPrincipalShapes(PrincipalShapes& shapes, std::streambuf& source);

} // namespace neuralWarp
