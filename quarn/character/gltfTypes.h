// SPDX-License-Identifier: Apache-2.0
// The numbers of glTF by which its accessors say what they hold.
#pragma once

#include "quarn/character/gltfJson.h"

#include <array>
#include <string_view>
#include <utility>

namespace quarn {

namespace gltfComponent {
inline constexpr std::uint64_t signedByte = 5120;
inline constexpr std::uint64_t unsignedByte = 5121;
inline constexpr std::uint64_t signedShort = 5122;
inline constexpr std::uint64_t unsignedShort = 5123;
inline constexpr std::uint64_t unsignedInt = 5125;
inline constexpr std::uint64_t single = 5126;
} // namespace gltfComponent

/// Bytes of a component. Throws std::runtime_error, naming `owner`, when there is no such type.
inline std::uint64_t componentBytes(std::uint64_t componentType, const std::string& owner) {
    switch (componentType) {
    case gltfComponent::signedByte:
    case gltfComponent::unsignedByte:
        return 1;
    case gltfComponent::signedShort:
    case gltfComponent::unsignedShort:
        return 2;
    case gltfComponent::unsignedInt:
    case gltfComponent::single:
        return 4;
    default:
        throw std::runtime_error(owner + ": \"componentType\" is none of glTF's");
    }
}

/// Components of an element of an accessor. Throws like componentBytes().
inline std::uint64_t componentCount(const JsonValue& accessor, const std::string& owner) {
    static constexpr std::array<std::pair<std::string_view, unsigned>, 7> types{
        {{"SCALAR", 1}, {"VEC2", 2}, {"VEC3", 3}, {"VEC4", 4}, {"MAT2", 4}, {"MAT3", 9}, {"MAT4", 16}}};
    const std::string type = textOf(accessor, "type");
    for (const auto& [name, count] : types)
        if (type == name)
            return count;
    throw std::runtime_error(owner + ": \"type\" is \"" + type + "\", which is none of glTF's");
}

inline bool isNormalized(const JsonValue& accessor) {
    const JsonValue* normalized = member(accessor, "normalized");
    return normalized != nullptr && normalized->IsTrue();
}

/// An extension of an object by its name, or null.
inline const JsonValue* extensionOf(const JsonValue& object, const char* name) {
    const JsonValue* extensions = member(object, "extensions");
    return extensions == nullptr ? nullptr : member(*extensions, name);
}

inline constexpr const char* meshoptExtension = "EXT_meshopt_compression";
inline constexpr const char* dracoExtension = "KHR_draco_mesh_compression";
inline constexpr const char* quantizationExtension = "KHR_mesh_quantization";

} // namespace quarn
