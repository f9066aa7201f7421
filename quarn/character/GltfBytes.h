// SPDX-License-Identifier: Apache-2.0
// What the buffers and buffer views of a glTF file hold.
#pragma once

#include "quarn/character/gltfJson.h"

#include <functional>
#include <map>
#include <string>
#include <string_view>

namespace quarn {

/// The bytes of the file that a URI names, which is relative to the glTF file. Throws std::runtime_error with the
/// reason.
using ReadUri = std::function<std::string(const std::string& uri)>;

/// The data of a URI that has them in itself, as "data:application/octet-stream;base64,...". Throws std::runtime_error,
/// which begins with `owner`. Thread: any.
std::string dataOfUri(const std::string& uri, const std::string& owner);

/// Reads buffers when they are asked for, each once. Thread: one.
class GltfBytes {
public:
    /// `document` has passed checkGltf(); it and `binary`, the data of the binary form (empty without), must live as
    /// long. The document may grow meanwhile.
    GltfBytes(const JsonValue& document, std::string_view binary, ReadUri readUri);

    /// The bytes of a view, "byteLength" of them; decompressed where it is compressed. Valid as long as this.
    /// Throws std::runtime_error, naming view or buffer, when they are not there or damaged.
    std::string_view view(std::size_t index);

    /// To be called before memory is taken for values: throws std::runtime_error when all that was asked for comes to
    /// more than 1 GiB. A few bytes of a file can stand for very many.
    void charge(std::uint64_t bytes);

private:
    std::string_view buffer(std::size_t index);
    std::string_view part(const JsonValue& from, const std::string& owner);

    const JsonValue& document_;
    std::string_view binary_;
    ReadUri readUri_;
    std::uint64_t charged_ = 0;
    std::map<std::size_t, std::string> buffers_;
    std::map<std::size_t, std::string> decompressed_; ///< by view
};

} // namespace quarn
