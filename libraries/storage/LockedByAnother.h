// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <stdexcept>

namespace storage {

/// Another process has what was asked for. Nothing is wrong, and the same may be done when that one has ended: quarn
/// ends with a code of its own then, so that whoever started it can tell.
struct LockedByAnother : std::runtime_error {
    using std::runtime_error::runtime_error;
};

} // namespace storage
