// SPDX-License-Identifier: Apache-2.0
// What was used in this process (Instrumenter). Nothing of it is stored, or leaves the process.
#pragma once

#include "openquarn/HApi.h"

#include <cstddef>
#include <string>
#include <vector>

namespace OpenQuarn {

struct UsageEvent {
    std::string name;
    std::size_t count;
};

/// Thread: any.
class OPENQUARN_API Usage {
public:
    Usage() = delete;

    /// The events so far, in the order they first happened.
    static std::vector<UsageEvent> events();
    static void clear() noexcept;
};

} // namespace OpenQuarn
