// SPDX-License-Identifier: Apache-2.0
// What every glTF file that is written here is made of.
#pragma once

#include "quarn/console/json.h"

#include <cstdint>
#include <iosfwd>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace quarn {

constexpr unsigned gltfVertexBuffer = 34962; ///< `target` of a buffer view
constexpr unsigned gltfIndexBuffer = 34963;
constexpr unsigned gltfFloat = 5126; ///< `componentType` of an accessor
constexpr unsigned gltfUnsigned = 5125;

/// The bytes of numbers, which stay where they are.
template <class Numbers>
std::string_view bytesOf(const Numbers& numbers) {
    return {reinterpret_cast<const char*>(numbers.data()), numbers.size() * sizeof(numbers[0])};
}

/// "asset", with the version of glTF and of this program.
void writeGltfAsset(JsonWriter& json);
/// "min" and "max", which glTF wants of positions. `numbers` [N][width], N above 0.
void writeGltfBox(JsonWriter& json, std::span<const float> numbers, std::size_t width);

/// The container: a header of 12 bytes, then a JSON and a binary chunk. `numbers` one after the other; the sum of their
/// lengths a multiple of 4. Throws std::runtime_error where all are more than 4 GB.
void writeGlb(std::ostream& out, std::string json, std::span<const std::string_view> numbers);

} // namespace quarn
