// SPDX-License-Identifier: Apache-2.0
// Foundation arrays as objects of the host, and back.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HStatus.h"
#include "openquarn/TArray.h"

/// `[any]` throughout.
class OPENQUARN_API TapiCastAnim {
public:
    /// Makes an object of kind HFn::kArrayObject of an array that was made with `new`. The object takes over the array,
    /// in every case: the array is deleted when the last handle on the object goes, or at once when the call fails.
    /// Null makes the null object, with success. `status` may be null; on failure the null object is returned.
    static HObject convertArrayToObject(TfloatArray* array, HStatus* status = nullptr) noexcept;
    static HObject convertArrayToObject(TuInt32Array* array, HStatus* status = nullptr) noexcept;
    static HObject convertArrayToObject(T3dFltVectorArray* array, HStatus* status = nullptr) noexcept;
    static HObject convertArrayToObject(T4dDblMatrixArray* array, HStatus* status = nullptr) noexcept;

    /// The array that an object was made of, valid while there is a handle on the object; null when the object is null
    /// or holds anything else.
    static const TfloatArray* floatArray(const HObject& object) noexcept;
    static const TuInt32Array* uInt32Array(const HObject& object) noexcept;
    static const T3dFltVectorArray* floatVectorArray(const HObject& object) noexcept;
    static const T4dDblMatrixArray* doubleMatrixArray(const HObject& object) noexcept;
};
