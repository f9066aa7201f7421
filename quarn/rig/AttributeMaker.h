// SPDX-License-Identifier: Apache-2.0
// Makes the attributes of a node type, in its initializer.
#pragma once

#include "openquarn/HFnAttribute.h"

#include <initializer_list>

namespace rig {

enum class Role {
    input,
    output, ///< nobody but compute() writes it, and it is not stored
};

/// Makes attributes, adds them to the type whose initializer is running, and remembers the first failure: a type whose
/// initializer fails is not registered. [main] throughout.
class AttributeMaker {
public:
    HObject number(const char* longName, const char* shortName, double defaultValue = 0.0, Role role = Role::input);
    HObject boolean(const char* longName, const char* shortName, bool defaultValue);
    /// Fields have the numbers 0, 1, 2 ... in the order of the labels.
    HObject choice(const char* longName, const char* shortName, std::initializer_list<const char*> labels,
                   short defaultValue = 0);
    /// The six rotation orders, with the numbers of HEulerRotation::RotationOrder.
    HObject rotationOrder(const char* longName, const char* shortName);
    /// A matrix that is the identity until it is set.
    HObject matrix(const char* longName, const char* shortName, Role role = Role::input);
    /// Data that is absent until it is set: a matrix, or a list of doubles.
    HObject data(const char* longName, const char* shortName, HFnData::Type kind);
    HObject compound(const char* longName, const char* shortName, std::initializer_list<HObject> children,
                     Role role = Role::input);
    void makeArray(const HObject& attribute);

    void add(std::initializer_list<HObject> attributes);
    /// A change of an input, or of anything below it, changes each output.
    void affects(std::initializer_list<HObject> inputs, std::initializer_list<HObject> outputs);
    /// The first failure; success without one.
    const HStatus& status() const { return status_; }

private:
    void note(const HStatus& status);
    void setRole(const HObject& attribute, Role role);

    HStatus status_;
};

} // namespace rig
