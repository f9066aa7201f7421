// SPDX-License-Identifier: Apache-2.0
// Attributes of node types, as people and programs read them.
#pragma once

#include "openquarn_app/NodeTypes.h"

#include <string>
#include <vector>

namespace quarn {

/// The attributes of a type and what they affect, as quarn lists them.
struct AttributeList {
    std::vector<OpenQuarn::AttributeInfo> attributes;
    std::vector<OpenQuarn::AffectsInfo> dependencies;
};

/// An array with one object an attribute, in the order of the list. Every object has all keys; what an attribute does
/// not have is null, and so is a default without data. Data that JSON has no form for is {}.
std::string attributeJson(const AttributeList& list);

/// One line an attribute, in the order of the list; children are indented. Flags stand only where they differ from a
/// new attribute of that kind.
std::string attributeLines(const AttributeList& list);

/// In the fewest digits that read back the same; with an exponent below a millionth and from 10^15.
std::string numberText(double value, bool isFloat);

/// Of a matrix, row by row, or of a list of doubles.
std::vector<double> numbersIn(const HObject& data);

} // namespace quarn
