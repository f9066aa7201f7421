// SPDX-License-Identifier: Apache-2.0
#include "storage/encodings.h"

#include <rapidjson/encodings.h>
#include <rapidjson/memorystream.h>

#include <algorithm>
#include <cstdint>

namespace storage {
namespace {

struct NoOutput {
    void Put(char) {}
};

} // namespace

std::size_t utf8Length(std::string_view text) {
    rapidjson::MemoryStream in(text.data(), text.size());
    NoOutput out;
    return rapidjson::UTF8<>::Validate(in, out) ? in.Tell() : 0;
}

bool isUtf8(std::string_view text) {
    while (const std::size_t length = utf8Length(text))
        text.remove_prefix(length);
    return text.empty();
}

std::string base64(std::string_view bytes) {
    constexpr std::string_view letters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
    std::string text;
    text.reserve((bytes.size() + 2) / 3 * 4);
    for (std::size_t at = 0; at < bytes.size(); at += 3) {
        const std::size_t there = std::min<std::size_t>(3, bytes.size() - at);
        std::uint32_t group = 0;
        for (std::size_t i = 0; i < 3; ++i)
            group = (group << 8U) | (i < there ? static_cast<unsigned char>(bytes[at + i]) : 0U);
        for (std::size_t i = 0; i < 4; ++i)
            text += i <= there ? letters[(group >> (18U - 6U * i)) & 63U] : '=';
    }
    return text;
}

} // namespace storage
