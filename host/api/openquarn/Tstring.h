// SPDX-License-Identifier: Apache-2.0
// Text as the foundation library keeps it.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HString.h"

#include <string>

/// A text of bytes that owns them. `[any]` throughout; one object is for one thread at a time.
class OPENQUARN_API Tstring {
public:
    Tstring() = default;
    Tstring(const char* text) // NOLINT(google-explicit-constructor): literals are texts; null counts as ""
        : text_(text ? text : "") {}
    Tstring(const HString& text) // NOLINT(google-explicit-constructor): the two libraries share their texts
        : text_(text.asStdString()) {}

    /// Valid until the object changes; never null, ends in NUL.
    const char* asChar() const noexcept { return text_.c_str(); }
    const std::string& asStdString() const noexcept { return text_; }
    bool isEmpty() const noexcept { return text_.empty(); }
    bool operator==(const Tstring& other) const noexcept { return text_ == other.text_; }

private:
    std::string text_;
};
