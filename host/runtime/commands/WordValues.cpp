// SPDX-License-Identifier: Apache-2.0
#include "commands/WordValues.h"

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <cmath>

namespace OpenQuarn {
namespace {

constexpr std::size_t longestQuote = 80;

HStatus isNot(const std::string& word, const char* kind) {
    return {HStatus::kFailure, inQuotes(word) + " is not " + kind};
}

template <class Number>
bool isWholly(std::string_view word, Number& value) {
    if (word.size() > 1 && word[0] == '+' && word[1] != '-')
        word.remove_prefix(1);
    const char* end = word.data() + word.size();
    const auto [stop, error] = std::from_chars(word.data(), end, value);
    return error == std::errc() && stop == end;
}

template <class Number>
HStatus readNumber(const std::string& word, Number& value, const char* kind) {
    Number read{};
    if (!isWholly(word, read))
        return isNot(word, kind);
    value = read;
    return {};
}

std::string lowerCase(std::string text) {
    std::transform(text.begin(), text.end(), text.begin(),
                   [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return text;
}

} // namespace

HStatus readWord(const std::string& word, bool& value) {
    constexpr std::array<const char*, 8> words{"false", "true", "off", "on", "no", "yes", "0", "1"};
    const auto* const found = std::find(words.begin(), words.end(), lowerCase(word));
    if (found == words.end())
        return isNot(word, "a boolean (true, on, yes, 1, false, off, no or 0)");
    value = (found - words.begin()) % 2 == 1;
    return {};
}

HStatus readWord(const std::string& word, int& value) {
    return readNumber(word, value, "an integer from -2147483648 to 2147483647");
}

HStatus readWord(const std::string& word, unsigned& value) {
    return readNumber(word, value, "an integer from 0 to 4294967295");
}

HStatus readWord(const std::string& word, double& value) {
    double read = 0;
    if (!isWholly(word, read) || !std::isfinite(read))
        return isNot(word, "a finite number");
    value = read;
    return {};
}

HStatus readWord(const std::string& word, HString& value) {
    value = HString(word);
    return {};
}

std::string inQuotes(std::string_view text) {
    std::string quoted(1, '\'');
    quoted += text.substr(0, longestQuote);
    quoted += text.size() > longestQuote ? "...'" : "'";
    return quoted;
}

} // namespace OpenQuarn
