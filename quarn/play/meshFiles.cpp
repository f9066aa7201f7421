// SPDX-License-Identifier: Apache-2.0
#include "quarn/play/meshFiles.h"

#include "storage/WholeFile.h"

#include <array>
#include <charconv>
#include <ostream>
#include <stdexcept>
#include <string>

namespace quarn {
namespace {

// in the fewest digits that read back the same
void appendNumber(std::string& text, float value) {
    std::array<char, 32> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr;
    text.append(digits.data(), end);
}

template <class Number>
void put(std::ostream& out, const Number& value) {
    out.write(reinterpret_cast<const char*>(&value), sizeof value);
}

} // namespace

void writeObj(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons) {
    std::string line;
    for (std::size_t vertex = 0; 3 * vertex < xyz.size(); ++vertex) {
        line = "v";
        for (std::size_t axis = 0; axis < 3; ++axis)
            appendNumber(line += ' ', xyz[3 * vertex + axis]);
        out << line << '\n';
    }
    for (std::size_t uv = 0; 2 * uv < polygons.uvs.size(); ++uv) {
        line = "vt";
        appendNumber(line += ' ', polygons.uvs[2 * uv]);
        appendNumber(line += ' ', polygons.uvs[2 * uv + 1]);
        out << line << '\n';
    }
    std::size_t corner = 0;
    for (const std::uint32_t size : polygons.sizes) {
        line = "f";
        for (std::uint32_t i = 0; i < size; ++i, ++corner) {
            line += " " + std::to_string(std::uint64_t{polygons.corners[corner]} + 1);
            if (!polygons.uvs.empty())
                line += "/" + std::to_string(std::uint64_t{polygons.uvCorners[corner]} + 1);
        }
        out << line << '\n';
    }
}

void writePly(std::ostream& out, std::span<const float> xyz, const MeshPolygons& polygons) {
    out << "ply\nformat binary_little_endian 1.0\nelement vertex " << xyz.size() / 3
        << "\nproperty float x\nproperty float y\nproperty float z\nelement face " << polygons.sizes.size()
        << "\nproperty list uchar uint vertex_indices\nend_header\n";
    out.write(reinterpret_cast<const char*>(xyz.data()), static_cast<std::streamsize>(xyz.size_bytes()));
    const std::uint32_t* corner = polygons.corners.data();
    for (const std::uint32_t size : polygons.sizes) {
        if (size > 255)
            throw std::runtime_error("a polygon has " + std::to_string(size) +
                                     " corners, and PLY takes at most 255: write .obj");
        put(out, static_cast<std::uint8_t>(size));
        out.write(reinterpret_cast<const char*>(corner), static_cast<std::streamsize>(size * sizeof(*corner)));
        corner += size;
    }
}

bool isMeshFile(const std::filesystem::path& path) {
    const std::string ending = path.extension().string();
    return ending == ".obj" || ending == ".ply" || ending == ".gltf" || ending == ".glb";
}

void writeMeshFile(const std::filesystem::path& path, std::span<const float> xyz, const MeshPolygons& polygons) {
    const std::string ending = path.extension().string();
    storage::WholeFile file(path);
    try {
        if (ending == ".obj")
            writeObj(file.stream(), xyz, polygons);
        else if (ending == ".ply")
            writePly(file.stream(), xyz, polygons);
        else
            writeGltf(file.stream(), xyz, polygons, ending == ".glb");
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(path.string() + " could not be written: " + error.what());
    }
    file.finish();
}

} // namespace quarn
