// SPDX-License-Identifier: Apache-2.0
// The characters of the tests, and reading them from a file.
#pragma once

#include "quarn/character/Character.h"
#include "quarn/character/GltfWriter.h"

#include <functional>

namespace quarn {

/// Two squares side by side along x, 0 to 1 and 1 to 2, of two triangles each, that share no vertex: 8 vertices, 6
/// places. Joint "upper" at the origin, "lower" at x = 1 below it.
struct Strip {
    std::string upper = R"({"name":"upper","children":[1]})";
    std::string lower = R"({"name":"lower","translation":[1,0,0]})";
    std::string mesh = R"({"name":"arm","mesh":0,"skin":0})";
    std::vector<float> seam = {0.5F, 0.5F}; ///< weights of "lower" at x = 1, in the first and the second square
    /// Adds to the file, or changes it.
    std::function<void(GltfWriter&)> more = [](GltfWriter&) {};

    GltfWriter write() const;
};

/// Of the strip: joints by "upper" 0 and "lower" 1.
std::vector<float> stripPoints();
std::vector<std::uint16_t> stripTriangles();

/// Writes the bytes to a file of that name in a folder of its own and reads it.
Character readBytesAs(const std::string& name, const std::string& bytes);
Character read(const GltfWriter& file);

} // namespace quarn
