// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: "metadata.json" of a model directory.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

namespace neuralWarp {

/// Which vertices of the trained geometry a model covers.
enum class SubsetState : std::int32_t {
    Unrecognized = 0, ///< The text is missing or none of the three below.
    Empty = 1,        ///< "empty"
    Complete = 2,     ///< "complete": all fullCount vertices, in order.
    Partial = 3,      ///< "partial": the vertices listed in affectMap.
};

/// How a model was trained. A fresh record is all zeros; a file without a key gives that key's default, which differs
/// for deltaMode (1).
struct ModelMetadata {
    bool loaded = false; ///< True after a successful read.
    std::uint32_t deltaCount = 0;
    std::uint32_t deltaMode = 0; ///< 0 Offset, 1 Surface; other values are kept as they stand in the file.
    std::uint32_t smoothingIterations = 0;
    std::uint32_t affectCount = 0;        ///< Vertices that the deformer affected in training.
    std::uint32_t fullCount = 0;          ///< Vertices of the whole trained geometry.
    std::vector<std::uint32_t> affectMap; ///< Indices in file order. Not checked against fullCount: not trusted.
    SubsetState subsetState = SubsetState::Unrecognized;
    std::string componentTagExpression; ///< Bytes as in the file: UTF-8 is not validated, zero bytes may occur.
    std::string geometry;               ///< As componentTagExpression.
};

/// Largest "metadata.json" that is read, in bytes; room for an affectMap of some seven million vertices.
inline constexpr std::uint64_t metadataFileLimit = std::uint64_t{64} << 20;

/// Reads a metadata file. Of a repeated key the first counts; unknown keys are ignored; a value of another type than
/// the key asks for gives the key's default, and one bad element empties the whole affectMap.
///
/// `record` filled on success; unchanged on failure.
/// `path`   full path of the file. Only a regular file (or a link to one) is opened: a pipe cannot stall the caller.
///
/// Returns true on success. On failure false, after one line on standard output:
///   "Failed to open metadata file stream\n"          no such file, not a regular file, or not readable
///   "Parse error\n"                                  not one JSON document, or more than that
///   "Error: PATH: REASON\n"                          larger than metadataFileLimit, of which nothing is read; a root
///                                                    value that is not an object; no memory, or another failure of
///                                                    the system
/// Never throws.
///
/// Thread: any; no shared state.
bool readMetadataFile(ModelMetadata& record, const std::filesystem::path& path) noexcept;

} // namespace neuralWarp
