// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdlib>

/// Ends the process where what the product promises does not hold: the fuzzer then keeps the input.
inline void require(bool holds) {
    if (!holds)
        std::abort();
}
