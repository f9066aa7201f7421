// SPDX-License-Identifier: Apache-2.0
#include "types/Data.h"

#include "core/text.h"

#include <map>
#include <mutex>
#include <stdexcept>
#include <unordered_map>

HPxData::~HPxData() = default;

HStatus HPxData::readASCII(const HString&) {
    return HStatus::kNotImplemented;
}
HStatus HPxData::readBinary(std::istream&, unsigned) {
    return HStatus::kNotImplemented;
}
HStatus HPxData::writeASCII(std::ostream&) {
    return HStatus::kNotImplemented;
}
HStatus HPxData::writeBinary(std::ostream&) {
    return HStatus::kNotImplemented;
}

namespace OpenQuarn {
namespace {

using DataTypes = std::map<std::uint32_t, std::shared_ptr<const DataType>>;

DataTypes& dataTypes() {
    static DataTypes types;
    return types;
}

/// Which data owns which object, for HDataHandle::set(HPxData*).
struct Owners {
    std::mutex mutex;
    std::unordered_map<const HPxData*, std::weak_ptr<PluginData>> byObject;
};

Owners& owners() {
    static Owners held;
    return held;
}

} // namespace

PluginData::PluginData(std::shared_ptr<const DataType> dataType, std::unique_ptr<HPxData> data)
    : type(std::move(dataType))
    , value(std::move(data)) {
    ++type->objects;
}

PluginData::~PluginData() {
    {
        const std::scoped_lock lock(owners().mutex);
        owners().byObject.erase(value.get());
    }
    value.reset();
    --type->objects;
}

std::shared_ptr<const DataType> findDataType(HTypeId id) {
    const auto found = dataTypes().find(id.id());
    return found == dataTypes().end() ? nullptr : found->second;
}

void addDataType(std::shared_ptr<const DataType> type) {
    if (type->name.empty() || !type->creator || type->id.id() == 0)
        throw std::invalid_argument("a data type needs a name, an id other than 0 and a creator: '" + type->name + "'");
    for (const auto& [id, other] : dataTypes())
        if (id == type->id.id() || other->name == type->name)
            throw std::invalid_argument("data type '" + type->name + "' (" + hexText(type->id) +
                                        ") is in the way of '" + other->name + "' (" + hexText(other->id) +
                                        "), which is registered");
    dataTypes().emplace(type->id.id(), std::move(type));
}

void removeDataType(HTypeId id) {
    const auto found = dataTypes().find(id.id());
    if (found == dataTypes().end())
        throw std::invalid_argument("no data type " + hexText(id) + " is registered");
    const int objects = found->second->objects;
    if (objects > 0)
        throw std::invalid_argument("data type '" + found->second->name + "' is in use by " + std::to_string(objects) +
                                    " objects");
    dataTypes().erase(found);
}

std::shared_ptr<PluginData> createPluginData(HTypeId id) {
    const std::shared_ptr<const DataType> type = findDataType(id);
    if (!type)
        throw std::runtime_error("no data type " + hexText(id) + " is registered");
    std::unique_ptr<HPxData> data(type->creator());
    if (!data)
        throw std::runtime_error("the creator of data type '" + type->name + "' gave no object");
    auto made = std::make_shared<PluginData>(type, std::move(data));
    const std::scoped_lock lock(owners().mutex);
    owners().byObject[made->value.get()] = made;
    return made;
}

std::shared_ptr<PluginData> ownerOf(const HPxData& data) {
    const std::scoped_lock lock(owners().mutex);
    const auto found = owners().byObject.find(&data);
    return found == owners().byObject.end() ? nullptr : found->second.lock();
}

} // namespace OpenQuarn
