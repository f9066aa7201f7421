// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HFnData.h"

#include "core/apiCall.h"
#include "types/Data.h"
#include "types/matrix.h"

using OpenQuarn::Access;
using OpenQuarn::apiValue;
using OpenQuarn::Operation;

namespace {

void attach(HFnBase& set, const HObject& object, HStatus* status) {
    const HStatus outcome = set.setObject(object);
    if (status)
        *status = outcome;
}

/// Makes a piece of data, and attaches it.
template <class Make>
HObject createData(Operation point, HStatus* status, HObject& attachTo, Make&& make) {
    return apiValue(point, status, HObject(), [&](HStatus&) {
        attachTo = HObject();
        attachTo = Access::object(make());
        return attachTo;
    });
}

} // namespace

HFnData::HFnData(const HObject& object, HStatus* status) {
    attach(*this, object, status);
}

HFnData::Type HFnData::dataType() const {
    const auto data = Access::as<OpenQuarn::Data>(object_);
    return data ? data->dataType() : kInvalid;
}

HFnStringData::HFnStringData(const HObject& object, HStatus* status) {
    attach(*this, object, status);
}

HObject HFnStringData::create(const HString& text, HStatus* status) {
    return createData(Operation::HFnStringData_create, status, object_,
                      [&] { return std::make_shared<OpenQuarn::StringData>(text.asStdString()); });
}

HString HFnStringData::string() const {
    const auto data = Access::as<OpenQuarn::StringData>(object_);
    return data ? HString(data->value) : HString();
}

HFnMatrixData::HFnMatrixData(const HObject& object, HStatus* status) {
    attach(*this, object, status);
}

HObject HFnMatrixData::create(const HMatrix& matrix, HStatus* status) {
    return createData(Operation::HFnMatrixData_create, status, object_,
                      [&] { return std::make_shared<OpenQuarn::MatrixData>(OpenQuarn::fromMatrix(matrix)); });
}

HMatrix HFnMatrixData::matrix() const {
    const auto data = Access::as<OpenQuarn::MatrixData>(object_);
    return data ? OpenQuarn::toMatrix(data->value) : HMatrix();
}

HFnDoubleArrayData::HFnDoubleArrayData(const HObject& object, HStatus* status) {
    attach(*this, object, status);
}

HObject HFnDoubleArrayData::create(const std::vector<double>& values, HStatus* status) {
    return createData(Operation::HFnDoubleArrayData_create, status, object_,
                      [&] { return std::make_shared<OpenQuarn::DoubleArrayData>(values); });
}

std::vector<double> HFnDoubleArrayData::values() const {
    const auto data = Access::as<OpenQuarn::DoubleArrayData>(object_);
    return data ? data->values : std::vector<double>();
}

HFnPluginData::HFnPluginData(const HObject& object, HStatus* status) {
    attach(*this, object, status);
}

HObject HFnPluginData::create(const HTypeId& type, HStatus* status) {
    return createData(Operation::HFnPluginData_create, status, object_,
                      [&] { return OpenQuarn::createPluginData(type); });
}

HPxData* HFnPluginData::data() const {
    const auto data = Access::as<OpenQuarn::PluginData>(object_);
    return data ? data->value.get() : nullptr;
}

HTypeId HFnPluginData::typeId() const {
    const auto data = Access::as<OpenQuarn::PluginData>(object_);
    return data ? data->type->id : HTypeId();
}
