// SPDX-License-Identifier: Apache-2.0
// The host's value types without a host around them: there are no threads to check, no faults on demand, and what is
// thrown ends the call of the page.
#pragma once

#include "openquarn/HStatus.h"

#include <utility>

namespace OpenQuarn {

enum class Operation {
    HArray_append,
    HArray_assign,
    HArray_reserve,
    HArray_setLength,
    HMatrix_inverse,
    HTransformationMatrix_getScale,
    HTransformationMatrix_getShear,
    HTransformationMatrix_reorderRotation,
    HTransformationMatrix_setScale,
    HTransformationMatrix_setShear,
    HTransformationMatrix_setTranslation,
    HTransformationMatrix_translation,
};

template <class Body>
HStatus apiCall(Operation, Body&& body) {
    return std::forward<Body>(body)();
}

template <class Value, class Body>
Value apiValue(Operation, HStatus* status, Value, Body&& body) {
    HStatus outcome;
    Value value = std::forward<Body>(body)(outcome);
    if (status)
        *status = outcome;
    return value;
}

} // namespace OpenQuarn
