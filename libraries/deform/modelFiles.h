// SPDX-License-Identifier: Apache-2.0
// The files of a model directory, each of which is good or an exception.
#pragma once

#include "frame/PrincipalBasis.h"
#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "nw_model/PrincipalBasisFiles.h"

#include <filesystem>
#include <memory>
#include <string>

namespace neuralWarp {

/// Throws FileMissing when there is nothing at the path, std::invalid_argument when it cannot be looked up, or is no
/// directory. [any]
void checkDirectory(const std::filesystem::path& directory);

/// All throw FileMissing or std::invalid_argument, with the path and the reason, and print nothing. [any]
std::string readMetadataText(const std::filesystem::path& file);
ModelMetadata readGoodMetadata(const std::filesystem::path& file);
std::unique_ptr<ModelSession> openSession(const std::filesystem::path& file);
/// None, with counts of 0, when the directory has no such file.
PrincipalShapesAnswer readBasis(const std::filesystem::path& directory, PrincipalBasis& basis);

} // namespace neuralWarp
