// SPDX-License-Identifier: Apache-2.0
// The words that a command was called with.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <vector>

/// The words behind the name of a command, in the order they were written and without their quotes. Indices count from
/// 0. A value: copies are independent. `[any]` throughout; one object is for one thread at a time.
class OPENQUARN_API HArgList {
public:
    /// How many words there are.
    unsigned length() const noexcept { return static_cast<unsigned>(impl_.size()); }

    /// The word as it is. Fails with kFailure, naming the index, when there is no such word; empty then. [any]
    HString asString(unsigned index, HStatus* status = nullptr) const;
    /// The word as an integer from -2^31 to 2^31 - 1. Fails with kFailure when there is no such word, or when it is no
    /// such number, naming the word; 0 then. [any]
    int asInt(unsigned index, HStatus* status = nullptr) const;
    /// The word as a finite number; fails as asInt() does. [any]
    double asDouble(unsigned index, HStatus* status = nullptr) const;
    /// The word as a boolean: true, on, yes or 1; false, off, no or 0; capitals or not. Fails as asInt() does, false
    /// then. [any]
    bool asBool(unsigned index, HStatus* status = nullptr) const;

    /// Appends a word, which counts as a flag when it looks like one (HSyntax says what does). [any]
    void addArg(const HString& word);
    /// Appends a number, so that reading it again gives the same value. [any]
    void addArg(int value);
    /// As above. [any]
    void addArg(double value);

private:
    friend class OpenQuarn::Access;
    struct Word {
        HString text;
        bool quoted = false; // never a flag
    };
    std::vector<Word> impl_;
};
