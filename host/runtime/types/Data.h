// SPDX-License-Identifier: Apache-2.0
// The pieces of data that a typed attribute can hold. Data is shared along connections and never changed once it is in
// the graph, except for a plug-in's own objects.
#pragma once

#include "core/Object.h"
#include "openquarn/HFnData.h"
#include "openquarn/HPxData.h"

#include <array>
#include <atomic>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace OpenQuarn {

class DataType;

class Data : public Object {
public:
    virtual HFnData::Type dataType() const = 0;
    bool isKind(HFn::Type type) const override { return type == HFn::kData || type == kind(); }
};

class StringData final : public Data {
public:
    explicit StringData(std::string text)
        : value(std::move(text)) {}
    HFn::Type kind() const override { return HFn::kStringData; }
    HFnData::Type dataType() const override { return HFnData::kString; }
    const std::string value;
};

/// 16 doubles, row by row.
using MatrixValue = std::array<double, 16>;
constexpr MatrixValue identityMatrix = {1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1, 0, 0, 0, 0, 1};

class MatrixData final : public Data {
public:
    explicit MatrixData(const MatrixValue& matrix)
        : value(matrix) {}
    HFn::Type kind() const override { return HFn::kMatrixData; }
    HFnData::Type dataType() const override { return HFnData::kMatrix; }
    const MatrixValue value;
};

class DoubleArrayData final : public Data {
public:
    explicit DoubleArrayData(std::vector<double> list)
        : values(std::move(list)) {}
    HFn::Type kind() const override { return HFn::kDoubleArrayData; }
    HFnData::Type dataType() const override { return HFnData::kDoubleArray; }
    const std::vector<double> values;
};

/// A plug-in's object. Gone, as a handle sees it, once its type is no longer registered.
class PluginData final : public Data {
public:
    PluginData(std::shared_ptr<const DataType> type, std::unique_ptr<HPxData> data);
    ~PluginData() override;
    HFn::Type kind() const override { return HFn::kPluginData; }
    HFnData::Type dataType() const override { return HFnData::kPlugin; }
    bool isAlive() const override { return value != nullptr; }
    const std::shared_ptr<const DataType> type;
    std::unique_ptr<HPxData> value;
};

/// A data type as a plug-in registered it.
class DataType {
public:
    std::string name;
    HTypeId id;
    HPxData* (*creator)() = nullptr;
    mutable std::atomic<int> objects{0}; ///< that exist: a type cannot be deregistered before they are gone
};

/// The registered data types. Thread: changes on the main thread, outside of evaluations.
std::shared_ptr<const DataType> findDataType(HTypeId id);
/// Throws std::invalid_argument naming what is in the way: the id, the name, a missing creator.
void addDataType(std::shared_ptr<const DataType> type);
/// Throws std::invalid_argument when there is none, or while objects of it exist.
void removeDataType(HTypeId id);

/// The data that owns a plug-in's object; null when the host did not create it.
std::shared_ptr<PluginData> ownerOf(const HPxData& data);

/// Makes an object through its type's creator. Throws std::runtime_error, naming the type, when the creator gives none.
std::shared_ptr<PluginData> createPluginData(HTypeId id);

} // namespace OpenQuarn
