// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/readJson.h"

#include "storage/FileError.h"
#include "storage/readWholeFile.h"

namespace quarn {

std::optional<rapidjson::Document> readJson(const std::filesystem::path& path) {
    constexpr std::uint64_t largest = std::uint64_t{64} << 20U;
    std::string text;
    try {
        text = storage::readWholeFile(path, largest);
    } catch (const storage::FileError&) {
        return {};
    }
    // iterative: nesting without end in a damaged file must not use up the stack
    constexpr unsigned flags = rapidjson::kParseIterativeFlag | rapidjson::kParseValidateEncodingFlag;
    rapidjson::Document document;
    document.Parse<flags>(text.data(), text.size());
    if (document.HasParseError())
        return {};
    return document;
}

} // namespace quarn
