// SPDX-License-Identifier: Apache-2.0
// Poses that hold from key to key, as they are drawn, made into a motion.
#pragma once

#include "openquarn/HObject.h"

#include <vector>

namespace quarn {

/// While it lives, curves of the open scene that are in steps go straight from key to key; at the keys nothing changes.
/// Thread: main.
class PosesInMotion {
public:
    PosesInMotion();
    ~PosesInMotion();
    PosesInMotion(const PosesInMotion&) = delete;
    PosesInMotion& operator=(const PosesInMotion&) = delete;

    /// There are such curves.
    bool any() const { return !curves_.empty(); }

private:
    std::vector<HObject> curves_;
};

} // namespace quarn
