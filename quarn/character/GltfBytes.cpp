// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/GltfBytes.h"

#include "quarn/character/gltfTypes.h"
#include "quarn/character/meshoptView.h"
#include "storage/encodings.h"

#include <stdexcept>
#include <utility>

namespace quarn {
namespace {

const JsonValue& at(const JsonValue& document, const char* list, std::size_t index) {
    return listOf(document, list)[static_cast<rapidjson::SizeType>(index)];
}

} // namespace

std::string dataOfUri(const std::string& uri, const std::string& owner) {
    constexpr std::string_view code = ";base64,";
    const std::size_t begin = uri.find(code);
    if (begin == std::string::npos || uri.find(',') < begin)
        throw std::runtime_error(owner + " has its data in its URI, but not in base 64");
    auto bytes = storage::fromBase64(std::string_view(uri).substr(begin + code.size()));
    if (!bytes)
        throw std::runtime_error(owner + " has a URI whose data are not base 64");
    return std::move(*bytes);
}

GltfBytes::GltfBytes(const JsonValue& document, std::string_view binary, ReadUri readUri)
    : document_(document)
    , binary_(binary)
    , readUri_(std::move(readUri)) {}

void GltfBytes::charge(std::uint64_t bytes) {
    constexpr std::uint64_t most = std::uint64_t{1} << 30U;
    if (bytes > most - charged_)
        throw std::runtime_error("the values that the file stands for take more than " + std::to_string(most) +
                                 " bytes");
    charged_ += bytes;
}

std::string_view GltfBytes::buffer(std::size_t index) {
    const std::string owner = element("buffers", index);
    const JsonValue& buffer = at(document_, "buffers", index);
    std::string_view bytes = binary_;
    if (member(buffer, "uri") != nullptr) {
        const auto [place, isNew] = buffers_.try_emplace(index);
        if (isNew) {
            const std::string uri = textOf(buffer, "uri");
            place->second = uri.starts_with("data:") ? dataOfUri(uri, owner) : readUri_(uri);
        }
        bytes = place->second;
    } else if (index > 0 || binary_.empty()) {
        throw std::runtime_error(owner + " has no data");
    }
    const std::uint64_t length = sizeOf(buffer, "byteLength", 0, owner);
    if (bytes.size() < length)
        throw std::runtime_error(owner + " should have " + std::to_string(length) + " bytes, and has " +
                                 std::to_string(bytes.size()));
    return bytes.substr(0, length);
}

// what a view, or the extension of one, says where its bytes are
std::string_view GltfBytes::part(const JsonValue& from, const std::string& owner) {
    const auto index = indexOf(member(from, "buffer"), listOf(document_, "buffers").Size(), "buffers", owner);
    if (!index)
        throw std::runtime_error(owner + " has no buffer");
    const std::string_view bytes = buffer(*index);
    const std::uint64_t offset = sizeOf(from, "byteOffset", 0, owner);
    const std::uint64_t length = sizeOf(from, "byteLength", 0, owner);
    if (offset + length > bytes.size())
        throw std::runtime_error(owner + " leaves its buffer, which has " + std::to_string(bytes.size()) + " bytes");
    return bytes.substr(offset, length);
}

std::string_view GltfBytes::view(std::size_t index) {
    const std::string owner = element("bufferViews", index);
    const JsonValue& view = at(document_, "bufferViews", index);
    const JsonValue* extension = extensionOf(view, meshoptExtension);
    if (extension == nullptr)
        return part(view, owner);
    const std::uint64_t wanted = sizeOf(view, "byteLength", 0, owner);
    if (const auto known = decompressed_.find(index); known != decompressed_.end())
        return std::string_view(known->second).substr(0, wanted);
    const MeshoptLayout layout = meshoptLayout(*extension, owner);
    const std::uint64_t length = layout.count * layout.stride;
    if (length < wanted)
        throw std::runtime_error(owner + " should have " + std::to_string(wanted) + " bytes, and its compressed data " +
                                 std::to_string(length));
    charge(length);
    const std::string& values =
        decompressed_.emplace(index, meshoptDecoded(layout, part(*extension, owner), owner)).first->second;
    return std::string_view(values).substr(0, wanted);
}

} // namespace quarn
