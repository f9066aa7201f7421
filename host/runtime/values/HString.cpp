// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HString.h"

#include <array>
#include <utility>

HString::HString(const char* text)
    : text_(text ? text : "") {}
HString::HString(std::string text) noexcept
    : text_(std::move(text)) {}
HString::HString(std::string_view text)
    : text_(text) {}

// bytes that no text of a person has, so that it cannot be taken for an argument
const HString HString::argUnused = HString(std::string("\x01unused\x01"));

HString& HString::operator+=(const HString& tail) {
    text_ += tail.text_;
    return *this;
}

HString HString::operator+(const HString& tail) const {
    return HString(text_ + tail.text_);
}

HString operator+(const char* head, const HString& tail) {
    return HString(head) + tail;
}

HString HString::format(const HString& text, const HString& arg1, const HString& arg2, const HString& arg3,
                        const HString& arg4, const HString& arg5, const HString& arg6, const HString& arg7,
                        const HString& arg8, const HString& arg9) {
    const std::array<const HString*, 9> arguments{&arg1, &arg2, &arg3, &arg4, &arg5, &arg6, &arg7, &arg8, &arg9};
    const std::string& format = text.text_;
    std::string filled;
    filled.reserve(format.size());
    for (std::size_t i = 0; i < format.size(); ++i) {
        const bool isPlaceholder = format[i] == '^' && i + 2 < format.size() && format[i + 1] >= '1' &&
                                   format[i + 1] <= '9' && format[i + 2] == 's';
        const HString* argument = isPlaceholder ? arguments[static_cast<std::size_t>(format[i + 1] - '1')] : nullptr;
        if (argument && *argument != argUnused) {
            filled += argument->text_;
            i += 2;
        } else {
            filled += format[i];
        }
    }
    return HString(std::move(filled));
}
