// SPDX-License-Identifier: Apache-2.0
// Categories of the host's profiler. What it records is the application's to say; see HProfilingScope.
#pragma once

#include "openquarn/HApi.h"

class OPENQUARN_API HProfiler {
public:
    HProfiler() = delete;

    /// Index of the category of that name, which is made when there is none. The same name always has the same index;
    /// "Evaluation" exists from the start and has index 0. Worth asking once and keeping: it takes a lock.
    /// `name` compared with case. -1, which records nothing, when it is null or empty or there is no memory. [any]
    static int getCategoryIndex(const char* name) noexcept;
};
