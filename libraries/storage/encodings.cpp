// SPDX-License-Identifier: Apache-2.0
#include "storage/encodings.h"

#include <rapidjson/encodings.h>
#include <rapidjson/memorystream.h>

#include <algorithm>
#include <array>
#include <cstdint>

namespace storage {
namespace {

constexpr std::string_view letters = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
constexpr unsigned char noDigit = 64;

// of every byte what it stands for as a letter
std::array<unsigned char, 256> digitsOf() {
    std::array<unsigned char, 256> digits{};
    digits.fill(noDigit);
    for (std::size_t i = 0; i < letters.size(); ++i)
        digits.at(static_cast<unsigned char>(letters[i])) = static_cast<unsigned char>(i);
    return digits;
}

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

std::optional<std::string> fromBase64(std::string_view text) {
    static const std::array<unsigned char, 256> digits = digitsOf();
    if (text.size() % 4 == 0)
        for (int padding = 0; padding < 2 && text.ends_with('='); ++padding)
            text.remove_suffix(1);
    if (text.size() % 4 == 1)
        return std::nullopt;
    std::string bytes;
    bytes.reserve(text.size() / 4 * 3 + 2);
    std::uint32_t group = 0;
    unsigned bits = 0;
    for (const char letter : text) {
        const unsigned char digit = digits.at(static_cast<unsigned char>(letter));
        if (digit == noDigit)
            return std::nullopt;
        group = group << 6U | digit;
        bits += 6;
        if (bits >= 8) {
            bits -= 8;
            bytes += static_cast<char>(group >> bits & 0xFFU);
        }
    }
    return bytes;
}

} // namespace storage
