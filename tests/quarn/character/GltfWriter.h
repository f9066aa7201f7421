// SPDX-License-Identifier: Apache-2.0
// Writes small glTF files, sound or not.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace quarn {

class GltfWriter {
public:
    /// Add an accessor, with a buffer view of its own, and give its index. `type` "SCALAR", "VEC3", ...
    std::size_t floats(const std::string& type, const std::vector<float>& values);
    std::size_t shorts(const std::string& type, const std::vector<std::uint16_t>& values);
    /// Of any type; `members` are further ones as JSON, with a comma before each.
    template <class Value>
    std::size_t values(const std::string& type, int componentType, const std::vector<Value>& values,
                       const std::string& members = "") {
        return add(type, componentType, values.size(), values.data(), values.size() * sizeof(Value), members);
    }
    /// A view of these bytes, and an accessor of the members `object`: their indices.
    std::size_t view(const std::string& bytes, const std::string& members = "");
    std::size_t accessor(const std::string& object);
    /// A view that is described by JSON, with "BYTES" for the members that say where in the buffer the bytes are.
    std::size_t viewLike(std::string members, const std::string& bytes);
    /// Lets the first mesh have another accessor as its "POSITION", "indices" and so on.
    void replace(const std::string& name, std::size_t accessor);

    /// The objects of the lists, as JSON.
    std::vector<std::string> nodes;
    std::vector<std::string> meshes;
    std::vector<std::string> skins;
    std::vector<std::string> animations;
    std::string roots = "0"; ///< of the scene
    std::string more;        ///< members of the file, with a comma before each
    std::string buffers;     ///< behind the one that there is, the same way

    std::string text() const;   ///< with the buffer in it
    std::string binary() const; ///< the same as .glb

private:
    std::size_t add(const std::string& type, int componentType, std::size_t count, const void* data, std::size_t size,
                    const std::string& members = "");
    std::string json(const std::string& buffer) const;

    std::string bytes_;
    std::vector<std::string> views_;
    std::vector<std::string> accessors_;
};

} // namespace quarn
