// SPDX-License-Identifier: Apache-2.0
// The binary part of a glTF file.
//
// Source: the glTF 2.0 specification of the Khronos Group: accessors and buffer views.
#pragma once

#include "quarn/console/json.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <string>
#include <string_view>
#include <vector>

namespace quarn {

/// Lists of numbers, one after the other, and the accessors by which a document knows them. Thread: one at a time.
class GltfNumbers {
public:
    enum class Shape { scalar, vec2, vec3, vec4, mat4 };
    /// What the numbers are for; `plain` for what is neither, as inverse bind matrices and keys.
    enum class Use { plain, vertices, indices };
    struct Kind {
        Shape shape = Shape::scalar;
        Use use = Use::plain;
        bool bounded = false; ///< with the least and largest of each component, as positions and times of keys need
    };

    /// Adds a list, whose length is a multiple of the numbers of the shape, and gives the index of its accessor. Throws
    /// std::runtime_error when all of them are more than a file can hold.
    std::size_t add(std::span<const float> numbers, const Kind& kind);
    std::size_t add(std::span<const std::uint32_t> numbers, const Kind& kind);
    std::size_t add(std::span<const std::uint16_t> numbers, const Kind& kind);

    /// Members "accessors", "bufferViews" and "buffers" of the object that is open. `uri` of the buffer, empty in a
    /// .glb.
    void write(JsonWriter& json, const std::string& uri = {}) const;
    std::string_view bytes() const { return bytes_; }

private:
    struct Accessor {
        std::size_t offset = 0, length = 0, count = 0; ///< bytes, bytes, elements
        unsigned component = 0;                        ///< the number of glTF for the type of the numbers
        Kind kind;
        std::vector<float> least, largest; ///< of each component, where bounded
    };
    std::size_t append(std::string_view bytes, std::size_t numberBytes, unsigned component, const Kind& kind);

    std::string bytes_;
    std::vector<Accessor> accessors_;
};

} // namespace quarn
