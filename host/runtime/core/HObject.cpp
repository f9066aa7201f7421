// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HObject.h"

#include "core/Object.h"
#include "core/apiCall.h"
#include "openquarn/HFnBase.h"

const HObject HObject::kNullObj;

HObject::HObject(std::shared_ptr<OpenQuarn::Object> object) noexcept
    : object_(std::move(object)) {}

bool HObject::isNull() const noexcept {
    return !object_ || !object_->isAlive();
}

HFn::Type HObject::apiType() const noexcept {
    return isNull() ? HFn::kInvalid : object_->kind();
}

bool HObject::hasFn(HFn::Type type) const noexcept {
    return !isNull() && object_->isKind(type);
}

HFnBase::~HFnBase() = default;

HStatus HFnBase::setObject(const HObject& object) {
    return OpenQuarn::apiCall(OpenQuarn::Operation::HFnBase_setObject, [&]() -> HStatus {
        object_ = object.hasFn(type()) ? object : HObject::kNullObj;
        if (object_.isNull())
            return {HStatus::kInvalidParameter,
                    object.isNull() ? "the object is null" : "the object is of another kind than the function set"};
        return HStatus::kSuccess;
    });
}
