// SPDX-License-Identifier: Apache-2.0
// What a part of a data set or of a point cache says of itself, for quarn merge: what made it, and how it joins the
// next one.
#pragma once

#include "quarn/scene/PartFrames.h"
#include "quarn/scene/Setup.h"

#include <cstddef>
#include <filesystem>
#include <initializer_list>
#include <optional>
#include <span>
#include <string>

namespace quarn {

/// A JSON object, "part.json" in the folder of a data set, "FILE.npy.part.json" beside a cache. docs/dataset.md lists
/// what is in it.
struct PartRecord {
    std::string build, quarn, instructionSet; ///< of the program that made it
    FrameRange frames, of;                    ///< of the part, and of the whole
    std::string firstSum;                     ///< rowSum() of its first row
    std::optional<std::string> nextSum; ///< of the frame after its last, evaluated after it; none at the whole's end
    std::string setupSum;               ///< of what both parts have to agree in: of the set-up without "part"
    std::optional<Setup> setup;         ///< the same in words, of a cache; a data set has a file for it

    static constexpr const char* fileName = "part.json";
    static std::filesystem::path besideCache(const std::filesystem::path& cache);

    /// Of this program and processor, without sums of rows. `setup` with or without "part".
    static PartRecord made(const PartFrames& frames, const Setup& setup);

    std::string json() const;
    /// None when the file is not there. Throws storage::FileError when it is no record of a part, or one of another
    /// version.
    static std::optional<PartRecord> read(const std::filesystem::path& file);
};

/// What a rowSum() begins with.
inline constexpr const char* rowSumKind = "xxh3_128:";

/// The sum of a row, whose bytes are these pieces one after the other.
std::string rowSum(std::initializer_list<std::span<const std::byte>> pieces);

} // namespace quarn
