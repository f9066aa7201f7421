// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: the principal shapes of a model directory, by the shortest way that there is.
#pragma once

#include <cstdint>
#include <filesystem>
#include <span>
#include <string>

namespace neuralWarp {

/// Where the numbers of a basis go as they are read.
class PrincipalShapesSink {
public:
    virtual ~PrincipalShapesSink() = default;
    /// A basis of `shapeCount` shapes of `vertCount` vertices comes, neither of them 0 and as large as the file says
    /// that holds it. What came of another before is void. May throw.
    ///   scales  [shapeCount] for halves: a number is scale * half, rounded to single precision, and finite; empty for
    ///           floats
    virtual void begin(std::uint64_t shapeCount, std::uint64_t vertCount, std::span<const float> scales) = 0;
    /// Its next vertices, [n][shapeCount][3], in model (object) space units: all of them finite. May throw. The first
    /// for floats, the second for halves (IEEE 754 binary16).
    virtual void append(std::span<const float> values) = 0;
    virtual void append(std::span<const std::uint16_t> halves) = 0;
};

/// What came of a reading.
struct PrincipalShapesAnswer {
    std::uint64_t shapeCount = 0, vertCount = 0; ///< as readPrincipalShapesFile() gives them
    bool isFromArchive = false;                  ///< the numbers are those of "principal_shapes.npz"
    std::string whyNotArchive;                   ///< it is there and of no use: the reason, to follow its name
};

/// Reads the basis of principal shapes of a model, "principal_shapes.json", or the same numbers from the archive
/// "principal_shapes.npz" beside it, which takes a tenth of the time, and a block of memory beside what the
/// sink takes. The archive is one of NumPy, stored or compressed, with
///   "json_xxh3_128"  '|S32' []                     XXH3-128 of all bytes of the JSON, as hexadecimal digits
///   "shapes"         '<f4' [vertices, shapes, 3]   the numbers that the JSON gives, to the bit
/// or, of a model in half precision, with "shapes" as '<f2' of the same shape, and
///   "scales"         '<f4' [shapes]                by which they are multiplied to give those numbers
/// or, of a model with a budget, with "scales" and, in the place of "shapes", whole numbers that become such halves,
///   "shapes_int16"   '<i2' [vertices, n, 3]        of the first n shapes, none of more than eleven significant bits
///   "shapes_int8"    '|i1' [vertices, m, 3]        of the others
/// It counts while it is sound, finite, of the JSON that is there, and of the two counts that the JSON begins with;
/// else the JSON is read as readPrincipalShapesFile() does, with its messages.
///
/// `directory`  the model directory.
/// `sink`       gets the numbers. What it has got counts only when the answer is true.
/// `answer`     replaced.
///
/// Returns true on success, also when there is nothing to load. Never throws: an exception of the sink is one of no
/// success, and reported as readPrincipalShapesFile() reports its own.
///
/// Thread: any; no shared state.
bool readPrincipalBasis(const std::filesystem::path& directory, PrincipalShapesSink& sink,
                        PrincipalShapesAnswer& answer) noexcept;

} // namespace neuralWarp
