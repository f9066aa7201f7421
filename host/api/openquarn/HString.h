// SPDX-License-Identifier: Apache-2.0
// Text as the host keeps it.
#pragma once

#include "openquarn/HApi.h"

#include <string>
#include <string_view>

/// A text of bytes, UTF-8 where they are shown to people. Owns its bytes. `[any]` throughout; one object is for one
/// thread at a time.
class OPENQUARN_API HString {
public:
    HString() = default;
    HString(const char* text);          // NOLINT(google-explicit-constructor): literals are texts; null counts as ""
    HString(std::string text) noexcept; // NOLINT(google-explicit-constructor)
    explicit HString(std::string_view text);

    /// Valid until the object changes; never null, ends in NUL.
    const char* asChar() const noexcept { return text_.c_str(); }
    const std::string& asStdString() const noexcept { return text_; }
    /// In bytes.
    unsigned length() const noexcept { return static_cast<unsigned>(text_.size()); }
    bool isEmpty() const noexcept { return text_.empty(); }
    void clear() noexcept { text_.clear(); }

    HString& operator+=(const HString& tail);
    HString operator+(const HString& tail) const;
    bool operator==(const HString& other) const noexcept { return text_ == other.text_; }
    bool operator!=(const HString& other) const noexcept { return text_ != other.text_; }
    bool operator<(const HString& other) const noexcept { return text_ < other.text_; }
    bool operator==(const char* other) const noexcept { return other && text_ == other; }
    bool operator!=(const char* other) const noexcept { return !(*this == other); }

    /// What an argument position of format() that is not used receives.
    static const HString argUnused;

    /// Fills the placeholders ^1s … ^9s of `text` with the arguments, each as often as it occurs. A placeholder whose
    /// argument is argUnused stays as it is written; "^" before anything else is an ordinary character; what an
    /// argument contains is never filled again.
    static HString format(const HString& text, const HString& arg1 = argUnused, const HString& arg2 = argUnused,
                          const HString& arg3 = argUnused, const HString& arg4 = argUnused,
                          const HString& arg5 = argUnused, const HString& arg6 = argUnused,
                          const HString& arg7 = argUnused, const HString& arg8 = argUnused,
                          const HString& arg9 = argUnused);

private:
    std::string text_;
};

OPENQUARN_API HString operator+(const char* head, const HString& tail);
