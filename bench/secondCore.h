// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "options.h"

namespace bench {

// How much longer a parallel loop on two threads takes right after a network's run than on its own: what the threads of
// the network's runtime leave of the second core. Networks of several sizes, without and with the entry in their
// metadata that asks for one thread.
void measureSecondCore(const Options& options);

} // namespace bench
