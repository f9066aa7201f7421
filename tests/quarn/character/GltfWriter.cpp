// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/GltfWriter.h"

#include <map>

namespace quarn {
namespace {

std::string joined(const std::vector<std::string>& objects) {
    std::string text;
    for (const std::string& object : objects)
        text += (text.empty() ? "" : ",\n") + object;
    return "[" + text + "]";
}

std::string base64(const std::string& bytes) {
    static const char digits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    for (std::size_t i = 0; i < bytes.size(); i += 3) {
        std::uint32_t three = 0;
        for (std::size_t k = 0; k < 3; ++k)
            three = three << 8U | (i + k < bytes.size() ? static_cast<unsigned char>(bytes[i + k]) : 0U);
        for (unsigned k = 0; k < 4; ++k)
            text += i + k > bytes.size() ? '=' : digits[three >> (18U - 6U * k) & 63U];
    }
    return text;
}

std::string number(std::size_t value) {
    std::string bytes;
    for (unsigned shift = 0; shift < 32; shift += 8)
        bytes += static_cast<char>(value >> shift & 255U);
    return bytes;
}

} // namespace

std::size_t GltfWriter::floats(const std::string& type, const std::vector<float>& values) {
    return add(type, 5126, values.size(), values.data(), values.size() * sizeof(float));
}

std::size_t GltfWriter::shorts(const std::string& type, const std::vector<std::uint16_t>& values) {
    return add(type, 5123, values.size(), values.data(), values.size() * sizeof(std::uint16_t));
}

void GltfWriter::replace(const std::string& name, std::size_t accessor) {
    const std::size_t at = meshes[0].find('"' + name + "\":") + name.size() + 3;
    meshes[0].replace(at, 1, std::to_string(accessor));
}

std::size_t GltfWriter::add(const std::string& type, int componentType, std::size_t count, const void* data,
                            std::size_t size, const std::string& members) {
    static const std::map<std::string, std::size_t> widths{
        {"SCALAR", 1}, {"VEC2", 2}, {"VEC3", 3}, {"VEC4", 4}, {"MAT4", 16}};
    const std::size_t from = view({static_cast<const char*>(data), size});
    return accessor("\"bufferView\":" + std::to_string(from) + ",\"componentType\":" + std::to_string(componentType) +
                    ",\"count\":" + std::to_string(count / widths.at(type)) + R"(,"type":")" + type + "\"" + members);
}

std::size_t GltfWriter::view(const std::string& bytes, const std::string& members) {
    return viewLike("{BYTES" + members + "}", bytes);
}

std::size_t GltfWriter::viewLike(std::string members, const std::string& bytes) {
    const std::string place = R"("buffer":0,"byteOffset":)" + std::to_string(bytes_.size()) +
                              ",\"byteLength\":" + std::to_string(bytes.size());
    views_.push_back(members.replace(members.find("BYTES"), 5, place));
    bytes_ += bytes;
    bytes_.resize((bytes_.size() + 3) / 4 * 4);
    return views_.size() - 1;
}

std::size_t GltfWriter::accessor(const std::string& members) {
    accessors_.push_back("{" + members + "}");
    return accessors_.size() - 1;
}

std::string GltfWriter::json(const std::string& buffer) const {
    return R"({"asset":{"version":"2.0"})" + more + R"(,"scene":0,"scenes":[{"nodes":[)" + roots +
           "]}],\n\"nodes\":" + joined(nodes) + ",\n\"meshes\":" + joined(meshes) + ",\n\"skins\":" + joined(skins) +
           ",\n\"animations\":" + joined(animations) + ",\n\"accessors\":" + joined(accessors_) +
           ",\n\"bufferViews\":" + joined(views_) + ",\n\"buffers\":[{\"byteLength\":" + std::to_string(bytes_.size()) +
           buffer + "}" + buffers + "]}";
}

std::string GltfWriter::text() const {
    return json(R"(,"uri":"data:application/octet-stream;base64,)" + base64(bytes_) + "\"");
}

std::string GltfWriter::binary() const {
    std::string text = json("");
    text.resize((text.size() + 3) / 4 * 4, ' ');
    return "glTF" + number(2) + number(28 + text.size() + bytes_.size()) + number(text.size()) + "JSON" + text +
           number(bytes_.size()) + std::string("BIN\0", 4) + bytes_;
}

} // namespace quarn
