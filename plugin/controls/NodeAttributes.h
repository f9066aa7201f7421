// SPDX-License-Identifier: Apache-2.0
// Makes the attributes of a node type, in its initializer.
#pragma once

#include "openquarn/HFnAttribute.h"

#include <initializer_list>

namespace neuralWarp {

/// What an attribute has beyond its name and kind; the host's defaults where nothing is said.
struct AttributeFlags {
    bool array = false;
    bool builder = false;
    bool writable = true;
    bool keyable = true; ///< if its kind is
    HFnAttribute::DisconnectBehavior onDisconnect = HFnAttribute::kNothing;
};

/// Makes attributes, adds them to the type whose initializer is running, and remembers the first failure: what comes
/// after it changes nothing that matters, for a type whose initializer fails is not registered. [main] throughout.
class NodeAttributes {
public:
    HObject number(const char* longName, const char* shortName, HFnNumericData::Type kind, double defaultValue,
                   const AttributeFlags& flags = {});
    /// Matrices as data: an element that was never set holds none.
    HObject matrix(const char* longName, const char* shortName, const AttributeFlags& flags);
    HObject compound(const char* longName, const char* shortName, std::initializer_list<HObject> children,
                     const AttributeFlags& flags);
    /// For one that was made elsewhere.
    void setFlags(const HObject& attribute, const AttributeFlags& flags);

    void add(std::initializer_list<HObject> attributes);
    void affects(std::initializer_list<HObject> inputs, std::initializer_list<HObject> outputs,
                 bool affectsTree = false);
    /// Keeps a failing status when it is the first.
    void note(const HStatus& status);
    /// The first failure; success without one.
    const HStatus& status() const { return status_; }

private:
    HStatus status_;
};

} // namespace neuralWarp
