// SPDX-License-Identifier: Apache-2.0
// Work inside one call that may take longer than a user waits without a word.
#pragma once

#include "openquarn/HString.h"

class OPENQUARN_API HLongWork {
public:
    HLongWork() = delete;

    /// Tells the user, as a warning, of work that is about to begin: "WHAT: up to 125 s".
    ///   what     begins with the name of who works, and says on what
    ///   seconds  at most, as far as can be told beforehand; below 1, and no number: "up to 1 s"
    /// [any]
    static void announce(const HString& what, double seconds);
    /// True once the user has asked for the end. Whoever works then gives up within a few tenths of a second, leaves
    /// everything as it was, and answers with a failure. It costs as little as a look at a flag. [any]
    static bool isInterrupted() noexcept;
};
