// SPDX-License-Identifier: Apache-2.0
#include "graph/values.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace OpenQuarn {
namespace {

template <class Integer>
Integer rounded(double value) {
    if (std::isnan(value))
        return 0;
    constexpr auto lowest = static_cast<double>(std::numeric_limits<Integer>::min());
    constexpr auto highest = static_cast<double>(std::numeric_limits<Integer>::max());
    return static_cast<Integer>(std::clamp(std::nearbyint(value), lowest, highest));
}

std::string misfit(const Slot& slot, const char* what) {
    const char* kind = slot.isArray() ? "an array" : slot.field.attribute->typeName();
    return "'" + slot.name() + "' is " + (slot.isArray() ? "" : "a ") + kind + " and cannot hold " + what;
}

} // namespace

double numberIn(const Slot& slot) {
    return slot.isLeaf() && slot.field.attribute->isNumber() ? slot.number : 0.0;
}
int intIn(const Slot& slot) {
    return rounded<int>(numberIn(slot));
}
short shortIn(const Slot& slot) {
    return rounded<short>(numberIn(slot));
}

std::string textIn(const Slot& slot) {
    const auto* text = dynamic_cast<const StringData*>(slot.data.get());
    return text ? text->value : std::string();
}

MatrixValue matrixIn(const Slot& slot) {
    const auto* matrix = dynamic_cast<const MatrixData*>(slot.data.get());
    return matrix ? matrix->value : identityMatrix;
}

std::string putNumber(Slot& slot, double value) {
    if (!slot.isLeaf() || !slot.field.attribute->isNumber())
        return misfit(slot, "a number");
    slot.number = slot.field.attribute->stored(value);
    return {};
}

std::string putData(Slot& slot, std::shared_ptr<Data> data) {
    if (!slot.isLeaf() || !slot.field.attribute->accepts(data.get()))
        return misfit(slot, data ? "that kind of data" : "data");
    slot.data = std::move(data);
    return {};
}

} // namespace OpenQuarn
