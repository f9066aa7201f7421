// SPDX-License-Identifier: Apache-2.0
// The inputs of a node, evaluated and read.
#pragma once

#include "openquarn/HDataBlock.h"
#include "openquarn/HEulerRotation.h"
#include "openquarn/HMatrix.h"

#include <utility>

namespace rig {

/// Reads attributes of a data block and remembers the first failure. What could not be read is 0, false or the
/// identity: look at status() before the values count. [eval] throughout.
class Inputs {
public:
    explicit Inputs(HDataBlock block)
        : block_(std::move(block)) {}

    HDataHandle handle(const HObject& attribute);
    bool boolean(const HObject& attribute) { return handle(attribute).asBool(); }
    int integer(const HObject& attribute) { return handle(attribute).asInt(); }
    double number(const HObject& attribute) { return handle(attribute).asDouble(); }
    HMatrix matrix(const HObject& attribute) { return handle(attribute).asMatrix(); }
    HVector vector(const HObject& x, const HObject& y, const HObject& z) { return {number(x), number(y), number(z)}; }
    /// Of an attribute that AttributeMaker::rotationOrder() made; a number that is no order is a failure.
    HEulerRotation::RotationOrder rotationOrder(const HObject& attribute);

    /// The first failure; success without one.
    const HStatus& status() const { return status_; }

private:
    void note(const HStatus& status);

    HDataBlock block_;
    HStatus status_;
};

} // namespace rig
