// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <stdexcept>

namespace quarn {

/// What the user has typed is no call of the program: a value that its option does not take, options that do not go
/// together. main() ends with 2, as for everything else that is wrong with the command line.
struct UsageError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

} // namespace quarn
