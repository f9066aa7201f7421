// SPDX-License-Identifier: Apache-2.0
// What programs of neuralWarp end with: docs/exitCodes.md. The trainer and the farm have the same table, in
// trainer/errors.py and clients/farm/neuralwarp_farm/codes.py; a test holds them together.
#pragma once

namespace quarn::exitCode {

constexpr int done = 0;
constexpr int failed = 1;
constexpr int usage = 2;         // what shells expect of a program that was not called as it can be
constexpr int notYet = 3;        // only of what asks how far work is
constexpr int locked = 75;       // EX_TEMPFAIL of sysexits.h: another process has it, so the same call may do later
constexpr int interrupted = 130; // as shells say that SIGINT has ended a program,
constexpr int terminated = 143;  // and SIGTERM

} // namespace quarn::exitCode
