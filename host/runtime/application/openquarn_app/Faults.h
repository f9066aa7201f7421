// SPDX-License-Identifier: Apache-2.0
// Failures on demand: makes any host operation fail, by name and by count of calls, so that what a plug-in or an
// application does about it can be tested.
#pragma once

#include "openquarn/HApi.h"

#include <string>
#include <string_view>
#include <vector>

namespace OpenQuarn {

/// Thread: any. One set of faults a process.
class OPENQUARN_API Faults {
public:
    /// Names of all operations that can be made to fail, as "Class::operation".
    static std::vector<std::string> operations();

    /// From now on, the `call`-th call of the operation (1: the next) and the ones after it fail, `times` of them
    /// altogether; replaces what was planned for the operation. Throws std::invalid_argument, naming the operation,
    /// when there is none of that name, and for a count below 1.
    static void fail(std::string_view operation, int call = 1, int times = 1);

    /// True when the operation has failed on demand since the last fail() or clear(). Throws as fail() does.
    static bool fired(std::string_view operation);

    /// Forgets all plans.
    static void clear();
};

} // namespace OpenQuarn
