// SPDX-License-Identifier: Apache-2.0
#include "openquarn/TapiCastAnim.h"

#include "core/Object.h"
#include "core/apiCall.h"

#include <memory>

using OpenQuarn::Access;

namespace {

template <class Array>
class ArrayObject final : public OpenQuarn::Object {
public:
    explicit ArrayObject(std::unique_ptr<const Array> array)
        : array_(std::move(array)) {}
    HFn::Type kind() const override { return HFn::kArrayObject; }
    bool isKind(HFn::Type type) const override { return type == HFn::kArrayObject || type == HFn::kData; }
    const Array* array() const { return array_.get(); }

private:
    std::unique_ptr<const Array> array_;
};

template <class Array>
HObject convert(Array* array, HStatus* status) noexcept {
    std::unique_ptr<const Array> owned(array);
    return OpenQuarn::apiValue(
        OpenQuarn::Operation::TapiCastAnim_convertArrayToObject, status, HObject(), [&](HStatus& /*outcome*/) {
            return owned ? Access::object(std::make_shared<ArrayObject<Array>>(std::move(owned))) : HObject();
        });
}

template <class Array>
const Array* arrayOf(const HObject& object) noexcept {
    const auto held = Access::as<ArrayObject<Array>>(object);
    return held ? held->array() : nullptr;
}

} // namespace

HObject TapiCastAnim::convertArrayToObject(TfloatArray* array, HStatus* status) noexcept {
    return convert(array, status);
}
HObject TapiCastAnim::convertArrayToObject(TuInt32Array* array, HStatus* status) noexcept {
    return convert(array, status);
}
HObject TapiCastAnim::convertArrayToObject(T3dFltVectorArray* array, HStatus* status) noexcept {
    return convert(array, status);
}
HObject TapiCastAnim::convertArrayToObject(T4dDblMatrixArray* array, HStatus* status) noexcept {
    return convert(array, status);
}

const TfloatArray* TapiCastAnim::floatArray(const HObject& object) noexcept {
    return arrayOf<TfloatArray>(object);
}
const TuInt32Array* TapiCastAnim::uInt32Array(const HObject& object) noexcept {
    return arrayOf<TuInt32Array>(object);
}
const T3dFltVectorArray* TapiCastAnim::floatVectorArray(const HObject& object) noexcept {
    return arrayOf<T3dFltVectorArray>(object);
}
const T4dDblMatrixArray* TapiCastAnim::doubleMatrixArray(const HObject& object) noexcept {
    return arrayOf<T4dDblMatrixArray>(object);
}
