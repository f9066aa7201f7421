// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/readJson.h"

#include <rapidjson/istreamwrapper.h>

#include <fstream>

namespace quarn {

std::optional<rapidjson::Document> readJson(const std::filesystem::path& path) {
    constexpr std::uintmax_t largest = std::uintmax_t{64} << 20U;
    std::error_code error;
    if (!std::filesystem::is_regular_file(path, error) || std::filesystem::file_size(path, error) > largest || error)
        return {};
    std::ifstream file(path, std::ios::binary);
    rapidjson::IStreamWrapper stream(file);
    // iterative: nesting without end in a damaged file must not use up the stack
    constexpr unsigned flags = rapidjson::kParseIterativeFlag | rapidjson::kParseValidateEncodingFlag;
    rapidjson::Document document;
    document.ParseStream<flags>(stream);
    if (document.HasParseError())
        return {};
    return document;
}

} // namespace quarn
