// SPDX-License-Identifier: Apache-2.0
// What is refused of an ONNX file before the runtime sees it.
#pragma once

#include <cstdint>
#include <filesystem>
#include <streambuf>

namespace neuralWarp {

/// Rounds that the loops of a network may make, nested in one another at worst.
inline constexpr std::uint64_t loopRoundLimit = 10'000;

/// Goes through the structure of an ONNX file, and past the numbers in it. Throws std::runtime_error with the reason
/// when tensor data lie in another file (the runtime would open whatever path stands there), when the number of rounds
/// of a Loop is not a constant (it need not end), when all of them multiplied exceed loopRoundLimit, when the metadata
/// entry "ort_config" asks for more than 1 to as many threads as the machine has cores (whether or not the runtime
/// would read it), and when the file is not well-formed or nested deeper than the runtime reads. Anything else is for
/// the runtime to judge.
void scanOnnxFile(const std::filesystem::path& path);
/// The same of `size` bytes of a source.
void scanOnnx(std::streambuf& source, std::uint64_t size);

} // namespace neuralWarp
