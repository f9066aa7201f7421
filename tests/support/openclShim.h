// SPDX-License-Identifier: Apache-2.0
// Stands between the program under test and the OpenCL loader: counts its calls and its objects, and makes calls fail.
// A test executable that has this as an object, and exports its symbols, has it for every library it loads.
#pragma once

#include <cstdint>
#include <string>

namespace clshim {

/// OpenCL calls of the process so far; of one function, "clBuildProgram".
std::uint64_t calls();
std::uint64_t calls(const std::string& function);

/// References that were made and not released: contexts, queues, programs, kernels, buffers, events.
std::int64_t liveObjects();

/// The `number`-th call from now on, 1 for the next, and the `times` - 1 after it answer with `status` and do nothing;
/// those that release still do. Replaces what was asked for before.
void failCall(std::uint64_t number, int status, std::uint64_t times = 1);
/// The same for the `number`-th call of one function.
void failCallOf(const std::string& function, std::uint64_t number, int status);
/// Every call fails, as on a device that has gone, until heal().
void loseDevice();
void heal();
/// The function of the last call that was made to fail; "" since heal() when there was none.
std::string failedCall();

} // namespace clshim
