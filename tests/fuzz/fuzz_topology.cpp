// SPDX-License-Identifier: Apache-2.0
// Adjacency and frames from a topology and a map that come from anywhere.
#include "topologyTarget.h"

#include <tbb/global_control.h>

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    // one thread: coverage then depends on the input alone
    static const tbb::global_control oneThread(tbb::global_control::max_allowed_parallelism, 1);
    fuzzTopology(data, size);
    return 0;
}
