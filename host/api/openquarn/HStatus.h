// SPDX-License-Identifier: Apache-2.0
// The outcome of a host call.
#pragma once

#include "openquarn/HApi.h"

#include <memory>
#include <string>

class HString;

/// A code, and for a failure a sentence that names the thing and the value it failed on. Cheap to copy and return; a
/// success holds no text. `[any]` throughout.
class OPENQUARN_API HStatus {
public:
    enum Code : int {
        kSuccess = 0,
        kFailure = 1,            ///< The call could not do its work; also: no such element, no such thing.
        kInsufficientMemory = 2, ///< There was no memory for it.
        kInvalidParameter = 3,   ///< An argument is unusable by itself: a null handle, a kind that does not fit.
        kUnknownParameter = 4,   ///< compute() was asked for an attribute that it does not produce.
        kNotImplemented = 5,     ///< The object has no such operation.
        kNotFound = 6,           ///< A search by name or path found nothing.
    };

    HStatus() noexcept = default;
    HStatus(Code code) noexcept // NOLINT(google-explicit-constructor): statuses are returned as their code
        : code_(code) {}
    /// `text` a whole sentence without a final newline; copied. Dropped when there is no memory for it.
    HStatus(Code code, const std::string& text) noexcept;

    Code statusCode() const noexcept { return code_; }
    bool error() const noexcept { return code_ != kSuccess; }
    explicit operator bool() const noexcept { return code_ == kSuccess; }
    bool operator==(const HStatus& other) const noexcept { return code_ == other.code_; }
    bool operator!=(const HStatus& other) const noexcept { return code_ != other.code_; }
    bool operator==(Code code) const noexcept { return code_ == code; }
    bool operator!=(Code code) const noexcept { return code_ != code; }

    /// The sentence of the failure; the name of the code where there is none; empty for a success.
    HString errorString() const;

    /// Reports a failure as "TEXT: ERRORSTRING" to the message sink; does nothing for a success.
    void perror(const char* text) const noexcept;

    /// Reports a failed host call: "API error in SOURCE, line LINE: ERRORSTRING", to the message sink with severity
    /// "report". Does nothing for a success.
    /// `source` name of the calling source unit; may not be null.
    void pAPIerror(const char* source, int line) const noexcept;

private:
    Code code_ = kSuccess;
    std::shared_ptr<const std::string> text_;
};
