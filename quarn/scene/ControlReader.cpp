// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/ControlReader.h"

#include "quarn/scene/controlNames.h"
#include "quarn/scene/plugs.h"

#include "openquarn_app/Evaluation.h"

#include <cmath>
#include <stdexcept>
#include <utility>

namespace quarn {

void ControlReader::read() {
    if (array_.isNull())
        array_ = warp_.plug("controlValues");
    // elements that come along a connection are there afterwards
    if (const HStatus status = OpenQuarn::evaluate(array_); status.error())
        throw std::runtime_error(std::string(array_.name().asChar()) +
                                 " could not be evaluated: " + status.errorString().asChar());
    if (std::vector<unsigned> indices = indicesOf(array_); indices != indices_ || plugs_.empty())
        takeElements(std::move(indices));
    if (!names_.empty() && plugs_.size() != names_.size())
        throw std::runtime_error(warp_.name + ".controlValues has " + std::to_string(plugs_.size()) +
                                 " values, and had " + std::to_string(names_.size()) + " in the first frame");
    values_.clear();
    for (const HPlug& plug : plugs_) {
        values_.push_back(static_cast<float>(numberOf(plug)));
        if (!std::isfinite(values_.back()))
            refuse(values_.size() - 1);
    }
}

void ControlReader::takeElements(std::vector<unsigned> indices) {
    plugs_.clear();
    for (const unsigned index : indices)
        plugs_.push_back(array_.elementByLogicalIndex(index));
    indices_ = std::move(indices);
}

void ControlReader::refuse(std::size_t place) const {
    const HPlug& plug = plugs_[place];
    throw std::runtime_error(plug.name().asStdString() + (names_.empty() ? "" : " (" + names_[place] + ")") + " is " +
                             std::to_string(numberOf(plug)) + ", which is no number to train with");
}

void ControlReader::readNames() {
    names_ = controlNames(warp_);
    if (names_.empty())
        throw std::runtime_error(warp_.name + ".controlValues has no values; connect the controls into it");
}

} // namespace quarn
