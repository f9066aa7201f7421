// SPDX-License-Identifier: Apache-2.0
// What the fuzz targets of the model runtime do with one input. Apart from the targets, so that a unit test can run
// the seed corpus through the same code.
#pragma once

#include <cstddef>
#include <cstdint>

/// Each hands `size` bytes to the product and ends the process (abort) when an outcome breaks what the product's
/// headers promise. Returns true when the product accepted the input.
bool fuzzMetadata(const std::uint8_t* data, std::size_t size);
bool fuzzPrincipalShapes(const std::uint8_t* data, std::size_t size);
bool fuzzShapesArchive(const std::uint8_t* data, std::size_t size);
bool fuzzOnnxLoad(const std::uint8_t* data, std::size_t size);
