// SPDX-License-Identifier: Apache-2.0
// Where the programs are that steps are made of.
#pragma once

#include "quarn/run/Step.h"

#include <map>

namespace quarn {

/// How a program is started, and which it is.
struct FoundProgram {
    Words words;                                    ///< before those of a step
    std::map<std::string, std::string> environment; ///< beside this process's
    std::string version;                            ///< "trainer 0.1.0"
};

/// This program. Thread: main.
FoundProgram thisQuarn();

/// The trainer: $NEURALWARP_TRAINER; else neuralwarp-train beside this program; else, when this program lies in the
/// build folder of a checkout, the checkout's package `trainer` with the first Python that has what it needs, of
/// $NW_PYTHON alone where that is set, or of /usr/bin/python3 and the python3 of the PATH; else the neuralwarp-train of
/// the PATH. Starts it to hear its version. Throws std::runtime_error that says where was looked. Thread: main.
FoundProgram findTrainer();

} // namespace quarn
