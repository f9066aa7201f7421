// SPDX-License-Identifier: Apache-2.0
#include "controls/orthoAxisFromMatrixArray.h"

#include "controls/arrayOutput.h"
#include "controls/axes.h"
#include "controls/guardedCompute.h"
#include "controls/matrixInput.h"
#include "openquarn_helpers/AttributeMaker.h"

#include <array>

namespace neuralWarp {

using openquarn_helpers::AttributeMaker;

const HTypeId orthoAxisFromMatrixArray::id(0x58000974);
const HString orthoAxisFromMatrixArray::typeName("orthoAxisFromMatrixArray");

HObject orthoAxisFromMatrixArray::input;
HObject orthoAxisFromMatrixArray::outputList;
HObject orthoAxisFromMatrixArray::output;

orthoAxisFromMatrixArray::orthoAxisFromMatrixArray() = default;
orthoAxisFromMatrixArray::~orthoAxisFromMatrixArray() = default;

HPxNode* orthoAxisFromMatrixArray::create() {
    return new (std::nothrow) orthoAxisFromMatrixArray;
}

HStatus orthoAxisFromMatrixArray::initialize() {
    AttributeMaker attributes;
    input = attributes.data("input", "in", HFnData::kMatrix, {.array = true, .onDisconnect = HFnAttribute::kDelete});
    output = attributes.number("output", "out", HFnNumericData::kDouble, 0.0, {.array = true, .builder = true});
    outputList = attributes.compound("outputList", "outl", {output},
                                     {.array = true, .builder = true, .onDisconnect = HFnAttribute::kDelete});
    attributes.add({input, outputList});
    attributes.affects({input}, {outputList});
    return attributes.status();
}

namespace {

std::array<double, 6> axisValues(const HMatrix& matrix) {
    const auto [x, y] = orthonormalAxes(matrix.row(0), matrix.row(1));
    return {x.x, x.y, x.z, y.x, y.y, y.z};
}

void writeAxes(HDataBlock& block, unsigned logicalIndex, const HMatrix& matrix) {
    HStatus status;
    HArrayDataHandle list = block.outputArrayValue(orthoAxisFromMatrixArray::outputList, &status);
    if (status.error())
        return;
    HArrayDataBuilder builder = list.builder(&status);
    if (status.error())
        return;
    status = writeListElement(list, builder, logicalIndex, orthoAxisFromMatrixArray::output, axisValues(matrix),
                              Surplus::keep);
    if (!status.error())
        list.set(builder);
}

} // namespace

HStatus orthoAxisFromMatrixArray::compute(const HPlug&, HDataBlock& block) {
    return guardedCompute(*this, "orthoAxisFromMatrixArray::compute", [&]() -> HStatus {
        HStatus status;
        HArrayDataHandle matrices = block.inputArrayValue(input, &status);
        if (status.error())
            return status;
        return forEachMatrix(matrices, [&](unsigned logicalIndex, const HMatrix& matrix) {
            writeAxes(block, logicalIndex, matrix);
            return HStatus();
        });
    });
}

} // namespace neuralWarp
