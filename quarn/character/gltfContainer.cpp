// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/gltfContainer.h"

#include "quarn/character/checkGltf.h"
#include "quarn/character/gltfJson.h"

#include <rapidjson/stringbuffer.h>
#include <rapidjson/writer.h>

#include <cstdint>

namespace quarn {
namespace {

// The binary form, after the glTF 2.0 specification, 4.4 "Binary glTF Layout": magic, version and length, then chunks
// of length, type and data, the first of them the JSON text. All numbers are little-endian.
constexpr std::string_view glbMagic = "glTF";
constexpr std::size_t glbHeader = 12;
constexpr std::size_t chunkHeader = 8;

std::uint32_t numberAt(std::string_view bytes, std::size_t at) {
    std::uint32_t value = 0;
    for (std::size_t i = 4; i-- > 0;)
        value = value << 8U | static_cast<unsigned char>(bytes[at + i]);
    return value;
}

void appendNumber(std::string& bytes, std::size_t value) {
    for (unsigned shift = 0; shift < 32; shift += 8)
        bytes.push_back(static_cast<char>(value >> shift & 0xFFU));
}

void checkObjects(const JsonValue& list, const std::string& things) {
    for (const JsonValue& entry : list.GetArray())
        if (!entry.IsObject())
            throw std::runtime_error("one of the " + things + " is not an object");
}

} // namespace

GltfParts gltfParts(std::string_view bytes) {
    if (bytes.substr(0, glbMagic.size()) != glbMagic)
        return {bytes, {}, {}};
    if (bytes.size() < glbHeader + chunkHeader || numberAt(bytes, 16) != numberAt("JSON", 0))
        throw std::runtime_error("the binary glTF file does not begin with its JSON text");
    if (numberAt(bytes, 4) != 2)
        throw std::runtime_error("binary glTF of version " + std::to_string(numberAt(bytes, 4)) + ", not 2");
    const std::size_t length = numberAt(bytes, 12);
    if (length > bytes.size() - glbHeader - chunkHeader)
        throw std::runtime_error("the binary glTF file ends in its JSON text");
    std::string_view chunks = bytes.substr(glbHeader + chunkHeader + length);
    if (!chunks.empty() && (chunks.size() < chunkHeader || numberAt(chunks, 0) > chunks.size() - chunkHeader))
        throw std::runtime_error("the binary glTF file ends in its binary data");
    std::string_view json = bytes.substr(glbHeader + chunkHeader, length);
    json.remove_suffix(json.size() - (json.find_last_not_of('\0') + 1)); // some writers fill it up so
    const bool hasData = !chunks.empty() && numberAt(chunks, 4) == numberAt(std::string_view("BIN\0", 4), 0);
    return {json, chunks, hasData ? chunks.substr(chunkHeader, numberAt(chunks, 0)) : std::string_view()};
}

std::string binaryGltf(std::string json, std::string_view chunks) {
    json.resize((json.size() + 3) / 4 * 4, ' ');
    std::string bytes(glbMagic);
    appendNumber(bytes, 2);
    appendNumber(bytes, glbHeader + chunkHeader + json.size() + chunks.size());
    appendNumber(bytes, json.size());
    return bytes + "JSON" + json + std::string(chunks);
}

storage::JsonDocument parseGltf(std::string_view json) {
    storage::JsonDocument document = storage::parseJson(json, storage::jsonRules::character);
    const JsonValue* asset = member(document, "asset");
    const std::string version = asset == nullptr ? "" : textOf(*asset, "version");
    if (version.substr(0, 2) != "2.")
        throw std::runtime_error("glTF of version \"" + version + "\", not 2");
    for (const char* things : {"nodes", "meshes", "animations", "accessors", "bufferViews", "buffers", "skins"})
        checkObjects(listOf(document, things), things);
    checkGltf(document);
    return document;
}

std::string gltfText(const storage::JsonValue& value) {
    rapidjson::StringBuffer buffer;
    rapidjson::Writer<rapidjson::StringBuffer> writer(buffer);
    value.Accept(writer);
    return {buffer.GetString(), buffer.GetSize()};
}

} // namespace quarn
