// SPDX-License-Identifier: Apache-2.0
// The definition of an attribute, and what becomes of it in a node type.
#pragma once

#include "core/Object.h"
#include "openquarn/HFnAttribute.h"
#include "types/Data.h"

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace OpenQuarn {

/// What kind of value an attribute has; numbers and enums are kept as a double, which holds each of their values
/// exactly.
class Attribute final : public Object {
public:
    Attribute(HFn::Type attributeKind, std::string longName, std::string briefName)
        : name(std::move(longName))
        , shortName(std::move(briefName))
        , kind_(attributeKind) {}
    HFn::Type kind() const override { return kind_; }
    bool isKind(HFn::Type type) const override { return type == HFn::kAttribute || type == kind_; }

    bool isNumber() const { return kind_ == HFn::kNumericAttribute || kind_ == HFn::kEnumAttribute; }
    bool isCompound() const { return kind_ == HFn::kCompoundAttribute; }
    bool holdsData() const { return kind_ == HFn::kTypedAttribute || kind_ == HFn::kMatrixAttribute; }
    /// True when a connection or a copy from `source` makes sense: the same kind of value, arrays and children aside.
    bool takesValueOf(const Attribute& source) const;
    /// The value as this attribute stores it: rounded and brought into the range of its type.
    double stored(double value) const;
    /// Why a number cannot be set by a command, and cannot stand in a scene file: "2.5 is not an integer from …"; empty
    /// when it can. The hard limits are no reason: see limited().
    std::string refusal(double value) const;
    /// Brought between the hard limits.
    double limited(double value) const;
    /// True when the data may be held: null, or of the attribute's kind.
    bool accepts(const Data* data) const;
    const char* typeName() const; ///< "double", "enum", "mesh" … for messages and listings

    const std::string name;
    const std::string shortName;
    HFnNumericData::Type number = HFnNumericData::kInvalid; ///< kShort for an enum
    HFnData::Type data = HFnData::kInvalid;
    HTypeId pluginData;
    double defaultNumber = 0.0;
    std::shared_ptr<Data> defaultData;
    std::optional<double> min, max, softMin, softMax;
    std::vector<std::pair<std::string, short>> fields;
    std::vector<std::shared_ptr<Attribute>> children;
    std::weak_ptr<Attribute> parent;

    bool array = false, readable = true, writable = true, connectable = true, storable = true;
    bool keyable = false, hidden = false, indexMatters = true, builder = false, filename = false;
    HFnAttribute::DisconnectBehavior onDisconnect = HFnAttribute::kNothing;
    bool fixed = false; ///< belongs to a node type: nothing of it changes any more

private:
    const HFn::Type kind_;
};

/// Makes an attribute. Throws std::invalid_argument when one of the names is no identifier.
std::shared_ptr<Attribute> makeAttribute(HFn::Type kind, const std::string& longName, const std::string& shortName);

/// An attribute in a node type: attributes of base types are shared by many types, what depends on what is each type's
/// own.
struct Field {
    struct Dependency {
        const Field* field; ///< the other one
        bool sameElement;   ///< elements of equal index only
    };

    std::shared_ptr<const Attribute> attribute;
    const Field* parent = nullptr;
    unsigned position = 0; ///< among the children of its parent, or among the type's top-level fields
    std::vector<std::unique_ptr<Field>> children;
    std::vector<Dependency> dependents; ///< what becomes dirty with it, everything considered
    std::vector<Dependency> affectedBy; ///< what it, or a field above it, was declared to depend on
    bool computed = false;              ///< something affects it: its value comes from compute() unless it is connected

    bool isArray() const { return attribute->array; }
    bool isCompound() const { return attribute->isCompound(); }
};

} // namespace OpenQuarn
