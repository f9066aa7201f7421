// SPDX-License-Identifier: Apache-2.0
// The readers of the model directory, from any source of bytes. The file readers open their file and call these, with
// its path for their messages.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <streambuf>
#include <string_view>
#include <vector>

#include "nw_model/ModelCertificate.h"
#include "nw_model/ModelMetadata.h"

namespace neuralWarp {

/// readMetadataFile() on the rest of `source`. May throw; `record` is unchanged then.
bool readMetadata(ModelMetadata& record, std::streambuf& source, const std::filesystem::path& path);

/// readCertificate() on the bytes of its file.
std::optional<ModelCertificate> certificateIn(std::string_view text);

/// Outputs of readPrincipalShapesFile().
struct PrincipalShapes {
    std::vector<float> values;
    std::uint64_t shapeCount = 0;
    std::uint64_t vertCount = 0;
};

/// readPrincipalShapesFile() on the rest of `source`. `shapes` must be fresh. May throw; `shapes` is of no use then.
bool readPrincipalShapes(PrincipalShapes& shapes, std::streambuf& source, const std::filesystem::path& path);

} // namespace neuralWarp
