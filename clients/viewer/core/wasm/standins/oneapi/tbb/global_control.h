// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>

namespace tbb {

class global_control {
public:
    enum parameter { max_allowed_parallelism };
    static std::size_t active_value(parameter) { return 1; }
};

} // namespace tbb
