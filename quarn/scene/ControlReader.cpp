// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/ControlReader.h"

#include "quarn/scene/controlNames.h"
#include "quarn/scene/plugs.h"

#include "openquarn_app/Evaluation.h"

#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

float narrowed(double value, const std::string& what) {
    const auto number = static_cast<float>(value);
    if (!std::isfinite(number))
        throw std::runtime_error(what + " is " + std::to_string(value) + ", which is no number to train with");
    return number;
}

} // namespace

void ControlReader::read() {
    const HPlug values = warp_.plug("controlValues");
    // elements that come along a connection are there afterwards
    if (const HStatus status = OpenQuarn::evaluate(values); status.error())
        throw std::runtime_error(std::string(values.name().asChar()) +
                                 " could not be evaluated: " + status.errorString().asChar());
    const std::vector<unsigned> indices = indicesOf(values);
    if (!names_.empty() && indices.size() != names_.size())
        throw std::runtime_error(warp_.name + ".controlValues has " + std::to_string(indices.size()) +
                                 " values, and had " + std::to_string(names_.size()) + " in the first frame");
    values_.clear();
    values_.reserve(indices.size());
    for (std::size_t i = 0; i < indices.size(); ++i) {
        const HPlug value = values.elementByLogicalIndex(indices[i]);
        const std::string name = value.name().asChar();
        values_.push_back(narrowed(numberOf(value), names_.empty() ? name : name + " (" + names_[i] + ")"));
    }
}

void ControlReader::readNames() {
    names_ = controlNames(warp_);
    if (names_.empty())
        throw std::runtime_error(warp_.name + ".controlValues has no values; connect the controls into it");
}

} // namespace quarn
