// SPDX-License-Identifier: Apache-2.0
#include "files/json.h"

#include "storage/encodings.h"

#include <array>
#include <bit>
#include <charconv>
#include <cmath>
#include <cstdint>

namespace OpenQuarn {
namespace {

constexpr std::uint64_t usualNan = 0x7ff8000000000000U;

std::string hexOf(std::string_view bytes) {
    constexpr std::string_view digits = "0123456789abcdef";
    std::string hex;
    hex.reserve(2 * bytes.size());
    for (const char byte : bytes) {
        const auto value = static_cast<unsigned char>(byte);
        hex += digits[value >> 4U];
        hex += digits[value & 15U];
    }
    return hex;
}

std::optional<std::string> bytesOf(std::string_view hex) {
    std::string bytes;
    bytes.reserve(hex.size() / 2);
    for (std::size_t i = 0; i + 1 < hex.size(); i += 2) {
        unsigned value = 0;
        const char* end = hex.data() + i + 2;
        if (std::from_chars(hex.data() + i, end, value, 16).ptr != end)
            return std::nullopt;
        bytes += static_cast<char>(value);
    }
    return hex.size() % 2 == 0 ? std::optional(bytes) : std::nullopt;
}

using Digits = std::array<char, 40>;

template <class Number>
std::string_view shortest(Digits& digits, Number value) {
    char* end = std::to_chars(digits.data(), digits.data() + digits.size(), value).ptr;
    return {digits.data(), static_cast<std::size_t>(end - digits.data())};
}

// Not empty for what JSON has no number for.
std::string wordFor(double value) {
    if (std::isfinite(value))
        return {};
    if (std::isinf(value))
        return value > 0 ? "inf" : "-inf";
    const auto bits = std::bit_cast<std::uint64_t>(value);
    if (bits == usualNan)
        return "nan";
    Digits digits;
    char* end = std::to_chars(digits.data(), digits.data() + digits.size(), bits, 16).ptr;
    return "nan:" + std::string(digits.data(), end);
}

std::optional<double> numberFromWord(std::string_view word) {
    if (word == "inf" || word == "-inf")
        return word[0] == '-' ? -HUGE_VAL : HUGE_VAL;
    if (word == "nan")
        return std::bit_cast<double>(usualNan);
    if (word.substr(0, 4) != "nan:")
        return std::nullopt;
    std::uint64_t bits = 0;
    const char* end = word.data() + word.size();
    const auto [stop, error] = std::from_chars(word.data() + 4, end, bits, 16);
    const auto value = std::bit_cast<double>(bits);
    return error == std::errc() && stop == end && std::isnan(value) ? std::optional(value) : std::nullopt;
}

// Whole numbers are easier to read without an exponent.
bool isPlainInteger(double value) {
    return std::fabs(value) < 1e15 && value == std::trunc(value) && !(value == 0.0 && std::signbit(value));
}

} // namespace

bool JsonWriter::Double(double value) {
    if (const std::string word = wordFor(value); !word.empty()) {
        plainText(word);
        return true;
    }
    Digits digits;
    if (isPlainInteger(value))
        raw(shortest(digits, static_cast<std::int64_t>(value)));
    else
        raw(value == 0.0 ? "-0.0" : shortest(digits, value));
    return true;
}

void JsonWriter::floatNumber(float value) {
    Digits digits;
    if (!std::isfinite(value) || isPlainInteger(value) || value == 0.0F) {
        Double(value);
        return;
    }
    // the reader goes through double: in the rare case that rounding twice leads elsewhere, all digits are needed
    const std::string_view text = shortest(digits, value);
    double read = 0.0;
    std::from_chars(text.data(), text.data() + text.size(), read);
    if (static_cast<float>(read) == value)
        raw(text);
    else
        Double(value);
}

void JsonWriter::text(std::string_view value) {
    if (storage::isUtf8(value)) {
        plainText(value);
        return;
    }
    StartObject();
    key("hex");
    plainText(hexOf(value));
    EndObject();
}

std::optional<double> numberOf(const storage::JsonValue& value) {
    if (value.IsNumber())
        return value.GetDouble();
    return value.IsString() ? numberFromWord(viewOf(value)) : std::nullopt;
}

std::optional<std::string> textOf(const storage::JsonValue& value) {
    if (value.IsString())
        return std::string(viewOf(value));
    if (!value.IsObject() || value.MemberCount() != 1)
        return std::nullopt;
    const auto member = value.MemberBegin();
    return viewOf(member->name) == "hex" && member->value.IsString() ? bytesOf(viewOf(member->value)) : std::nullopt;
}

std::string jsonOf(const storage::JsonValue& value) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    value.Accept(writer);
    return {buffer.GetString(), buffer.GetSize()};
}

} // namespace OpenQuarn
