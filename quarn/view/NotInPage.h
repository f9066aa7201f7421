// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <stdexcept>

namespace quarn {

/// A part of the scene that a page cannot compute, and could do without: the sentence says why, naming the plug.
struct NotInPage : std::runtime_error {
    using std::runtime_error::runtime_error;
};

} // namespace quarn
