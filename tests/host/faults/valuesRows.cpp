// SPDX-License-Identifier: Apache-2.0
#include "host/faults/FaultRows.h"

#include "openquarn/HDoubleArray.h"
#include "openquarn/HTransformationMatrix.h"
#include "openquarn/TapiCastAnim.h"

namespace {

std::vector<FaultRow> arrayRows() {
    return {
        {"HArray::setLength", [] { return HDoubleArray().setLength(3); }},
        {"HArray::reserve", [] { return HDoubleArray().reserve(3); }},
        {"HArray::append", [] { return HDoubleArray().append(1.0); }},
        {"HArray::assign",
         [] {
             const double value = 1.0;
             return HDoubleArray().assign(&value, 1);
         }},
        {"TapiCastAnim::convertArrayToObject",
         [] {
             HStatus status;
             const HObject object = TapiCastAnim::convertArrayToObject(new TfloatArray(8, 2), &status);
             return object.isNull() == status.error() ? status : HStatus(HStatus::kNotImplemented);
         }},
    };
}

} // namespace

std::vector<FaultRow> valuesRows() {
    static double numbers[3] = {1, 2, 3};
    std::vector<FaultRow> rows = arrayRows();
    const std::vector<FaultRow> transformationRows = {
        {"HMatrix::inverse",
         [] {
             HStatus status;
             HMatrix().inverse(&status);
             return status;
         }},
        {"HTransformationMatrix::translation",
         [] {
             HStatus status;
             HTransformationMatrix().translation(HSpace::kTransform, &status);
             return status;
         }},
        {"HTransformationMatrix::setTranslation",
         [] {
             return HTransformationMatrix().setTranslation({1, 2, 3}, HSpace::kTransform);
         }},
        {"HTransformationMatrix::getScale",
         [] { return HTransformationMatrix().getScale(numbers, HSpace::kTransform); }},
        {"HTransformationMatrix::setScale",
         [] { return HTransformationMatrix().setScale(numbers, HSpace::kTransform); }},
        {"HTransformationMatrix::getShear",
         [] { return HTransformationMatrix().getShear(numbers, HSpace::kTransform); }},
        {"HTransformationMatrix::setShear",
         [] { return HTransformationMatrix().setShear(numbers, HSpace::kTransform); }},
        {"HTransformationMatrix::reorderRotation",
         [] { return HTransformationMatrix().reorderRotation(HEulerRotation::kZYX); }},
    };
    rows.insert(rows.end(), transformationRows.begin(), transformationRows.end());
    return rows;
}
