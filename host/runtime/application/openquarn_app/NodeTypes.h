// SPDX-License-Identifier: Apache-2.0
// The node types that are registered, and what attributes they have.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HFnAttribute.h"

#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace OpenQuarn {

/// An attribute of a node type. The flags are those of HFnAttribute.
struct AttributeInfo {
    std::string name;
    std::string shortName;
    std::string parent;     ///< long name of the compound that it is a child of; empty when there is none
    bool inherited = false; ///< from the kind of node that the type is built on

    HFn::Type kind = HFn::kInvalid; ///< which function set works on it
    /// "bool", "short", "int", "float", "double", "enum", "string", "matrix", "doubleArray", "mesh", "pluginData",
    /// "compound" or "message".
    std::string valueType;
    HTypeId pluginDataType;                            ///< 0 unless valueType is "pluginData"
    std::vector<std::pair<short, std::string>> fields; ///< of an enum, in the order they were added

    double defaultNumber = 0.0; ///< of numbers and enums
    HObject defaultData;        ///< of typed attributes; null when they begin without data
    std::optional<double> min, max, softMin, softMax;

    bool array = false, readable = false, writable = false, connectable = false, storable = false;
    bool keyable = false, hidden = false, indexMatters = false, usesArrayDataBuilder = false, usedAsFilename = false;
    HFnAttribute::DisconnectBehavior disconnectBehavior = HFnAttribute::kNothing;
};

/// A declaration that an attribute depends on another; both by their long names.
struct AffectsInfo {
    std::string affecting;
    std::string affected;
    bool tree = false;        ///< what is below `affecting` counts as it
    bool sameElement = false; ///< only the element of `affected` that has the index of the changed one
    bool inherited = false;
};

/// Names of all registered node types, sorted. Thread: main.
OPENQUARN_API std::vector<std::string> nodeTypes();

/// The attributes of a type in the order they were added, inherited ones first; the children of a compound follow it,
/// in their order. Throws std::runtime_error when no type of that name is registered. Thread: main.
OPENQUARN_API std::vector<AttributeInfo> attributesOf(const std::string& nodeType);

/// What affects what in a type, in the order in which it was declared, inherited declarations first. Throws as
/// attributesOf() does. Thread: main.
OPENQUARN_API std::vector<AffectsInfo> dependenciesOf(const std::string& nodeType);

} // namespace OpenQuarn
