// SPDX-License-Identifier: Apache-2.0
// A list of doubles that is read once and kept until it is another one.
#pragma once

#include "openquarn/HDataBlock.h"

#include <vector>

namespace rig {

/// The values of a data attribute of kind kDoubleArray. Data in the graph never changes: another list is another
/// object, so that the same object need not be read again. For one thread at a time.
class ArrayInput {
public:
    /// Reads the list unless it is the one that was read last; absent data is an empty list. True when it is another.
    /// [eval]
    bool update(const HDataHandle& handle) {
        HObject data = handle.data();
        if (data == data_)
            return false;
        values_ = HFnDoubleArrayData(data).values();
        data_ = std::move(data); // kept, so that no other object can have its address
        return true;
    }
    const std::vector<double>& values() const { return values_; }

private:
    HObject data_;
    std::vector<double> values_;
};

} // namespace rig
