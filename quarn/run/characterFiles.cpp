// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/characterFiles.h"

#include "storage/Json.h"

#include <charconv>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using storage::JsonValue;

// RFC 3986, section 2.1: %20 and the like
std::string decoded(std::string_view uri) {
    std::string text;
    for (std::size_t at = 0; at < uri.size(); ++at) {
        unsigned char byte = 0;
        const bool isCode =
            uri[at] == '%' && at + 2 < uri.size() &&
            std::from_chars(uri.data() + at + 1, uri.data() + at + 3, byte, 16).ptr == uri.data() + at + 3;
        text += isCode ? static_cast<char>(byte) : uri[at];
        at += isCode ? 2 : 0;
    }
    return text;
}

std::vector<fs::path> buffersOf(const fs::path& gltf) {
    const storage::JsonDocument document = storage::readJson(gltf.string(), storage::jsonRules::character);
    std::vector<fs::path> files;
    if (!document.IsObject() || !document.HasMember("buffers") || !document["buffers"].IsArray())
        return files;
    for (const JsonValue& buffer : document["buffers"].GetArray()) {
        if (!buffer.IsObject() || !buffer.HasMember("uri") || !buffer["uri"].IsString())
            continue;
        const std::string_view uri = storage::viewOf(buffer["uri"]);
        const fs::path file = gltf.parent_path() / decoded(uri);
        std::error_code error;
        if (uri.substr(0, 5) != "data:" && fs::is_regular_file(file, error))
            files.push_back(file);
    }
    return files;
}

} // namespace

std::vector<fs::path> characterFiles(const fs::path& character) {
    std::vector<fs::path> files{character};
    if (character.extension() != ".gltf")
        return files;
    try {
        const std::vector<fs::path> buffers = buffersOf(character);
        files.insert(files.end(), buffers.begin(), buffers.end());
    } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): the import says what is wrong with it
    }
    return files;
}

} // namespace quarn
