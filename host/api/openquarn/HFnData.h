// SPDX-License-Identifier: Apache-2.0
// Pieces of data: what a typed attribute holds.
#pragma once

#include "openquarn/HFnBase.h"
#include "openquarn/HString.h"
#include "openquarn/HTypeId.h"

#include <vector>

class HMatrix;
class HPxData;

/// Kinds of data, and the set that tells them apart.
class OPENQUARN_API HFnData : public HFnBase {
public:
    /// The values are part of the API: scene files and plug-ins rely on them.
    enum Type : int {
        kInvalid = 0,
        kNumeric = 1, ///< A single number; HFnNumericData says which.
        kPlugin = 2,
        kString = 4,
        kMatrix = 5,
        kDoubleArray = 7,
        kMesh = 14,
    };
    HFnData() = default;
    /// `object` a piece of data. Fails as setObject() does. [any]
    explicit HFnData(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kData; }
    /// kInvalid when nothing is attached. [any]
    Type dataType() const;
};

/// Kinds of numbers. All are stored so that each of their values is kept exactly.
class OPENQUARN_API HFnNumericData {
public:
    enum Type : int { kInvalid = 0, kBoolean = 1, kShort = 2, kInt = 3, kFloat = 4, kDouble = 5 };
};

/// A text.
class OPENQUARN_API HFnStringData : public HFnBase {
public:
    HFnStringData() = default;
    /// Fails as setObject() does. [any]
    explicit HFnStringData(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kStringData; }
    /// Makes a new piece of data and attaches the set to it; null on failure. [any]
    HObject create(const HString& text, HStatus* status = nullptr);
    /// "" when nothing is attached. [any]
    HString string() const;
};

/// A 4 x 4 matrix.
class OPENQUARN_API HFnMatrixData : public HFnBase {
public:
    HFnMatrixData() = default;
    /// Fails as setObject() does. [any]
    explicit HFnMatrixData(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kMatrixData; }
    /// Makes a new piece of data and attaches the set to it; null on failure. [any]
    HObject create(const HMatrix& matrix, HStatus* status = nullptr);
    /// The identity when nothing is attached. [any]
    HMatrix matrix() const;
};

/// A list of doubles kept as one value (not an array attribute).
class OPENQUARN_API HFnDoubleArrayData : public HFnBase {
public:
    HFnDoubleArrayData() = default;
    /// Fails as setObject() does. [any]
    explicit HFnDoubleArrayData(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kDoubleArrayData; }
    /// Makes a new piece of data from a copy of `values` and attaches the set to it; null on failure. [any]
    HObject create(const std::vector<double>& values, HStatus* status = nullptr);
    /// Empty when nothing is attached. [any]
    std::vector<double> values() const;
};

/// Data of a type that a plug-in registered.
class OPENQUARN_API HFnPluginData : public HFnBase {
public:
    HFnPluginData() = default;
    /// Fails as setObject() does. [any]
    explicit HFnPluginData(const HObject& object, HStatus* status = nullptr);
    HFn::Type type() const override { return HFn::kPluginData; }
    /// Makes a new, empty object through the creator that was registered for `type` and attaches the set to it; null
    /// when no such type is registered or its creator gives none. [eval]
    HObject create(const HTypeId& type, HStatus* status = nullptr);
    /// The plug-in's object, owned by the data; null when nothing is attached. [any]
    HPxData* data() const;
    /// Id of the data's type; 0 when nothing is attached. [any]
    HTypeId typeId() const;
};
