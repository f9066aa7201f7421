// SPDX-License-Identifier: Apache-2.0
#include "rig/Inputs.h"

#include "openquarn/HFnAttribute.h"

#include <string>

namespace rig {

void Inputs::note(const HStatus& status) {
    if (!status_.error())
        status_ = status;
}

HDataHandle Inputs::handle(const HObject& attribute) {
    HStatus status;
    HDataHandle value = block_.inputValue(attribute, &status);
    note(status);
    return value;
}

HEulerRotation::RotationOrder Inputs::rotationOrder(const HObject& attribute) {
    const int number = integer(attribute);
    if (number >= HEulerRotation::kXYZ && number <= HEulerRotation::kZYX)
        return static_cast<HEulerRotation::RotationOrder>(number);
    note({HStatus::kFailure, HFnAttribute(attribute).name().asStdString() + " is " + std::to_string(number) +
                                 ", which is no rotation order (0 to 5)"});
    return HEulerRotation::kXYZ;
}

} // namespace rig
