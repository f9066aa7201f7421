// SPDX-License-Identifier: Apache-2.0
// Looking things up in the JSON of a glTF file, which may hold anything.
#pragma once

#include "storage/Json.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <stdexcept>
#include <string>

namespace quarn {

using storage::JsonValue;

/// The member of an object, or null when there is none (or `object` is none).
inline const JsonValue* member(const JsonValue& object, const char* key) {
    if (!object.IsObject())
        return nullptr;
    const auto found = object.FindMember(key);
    return found == object.MemberEnd() ? nullptr : &found->value;
}

/// The objects of an array member; nothing when there is none. Throws when it is something else.
inline const JsonValue& listOf(const JsonValue& object, const char* key) {
    static const JsonValue nothing(rapidjson::kArrayType);
    const JsonValue* list = member(object, key);
    if (list == nullptr)
        return nothing;
    if (!list->IsArray())
        throw std::runtime_error(std::string("\"") + key + "\" is not an array");
    return *list;
}

inline std::string textOf(const JsonValue& object, const char* key) {
    const JsonValue* text = member(object, key);
    return text != nullptr && text->IsString() ? std::string(text->GetString(), text->GetStringLength())
                                               : std::string();
}

inline std::string textOf(const JsonValue& text) {
    return {text.GetString(), text.GetStringLength()};
}

/// A count, size or offset; `absent` when the member is not there. Throws when it is no whole number from 0 to 2^53.
inline std::uint64_t sizeOf(const JsonValue& object, const char* key, std::uint64_t absent, const std::string& owner) {
    const JsonValue* value = member(object, key);
    if (value == nullptr)
        return absent;
    if (!value->IsUint64() || value->GetUint64() > (std::uint64_t{1} << 53U))
        throw std::runtime_error(owner + ": \"" + key + "\" is not a size");
    return value->GetUint64();
}

/// An index into a list of `count` things; nothing when `value` is null. Throws when there is no such thing.
inline std::optional<std::size_t> indexOf(const JsonValue* value, std::size_t count, const char* things,
                                          const std::string& owner) {
    if (value == nullptr)
        return std::nullopt;
    if (!value->IsUint64())
        throw std::runtime_error(owner + " names one of the " + things + " by something that is no index");
    if (value->GetUint64() >= count)
        throw std::runtime_error(owner + " refers to " + things + "[" + std::to_string(value->GetUint64()) +
                                 "], but there are " + std::to_string(count));
    return static_cast<std::size_t>(value->GetUint64());
}

/// The array that is a member of an object; a new one when there is none. What is there must be an array.
inline JsonValue& arrayMember(JsonValue& object, const char* key, storage::JsonDocument& document) {
    if (member(object, key) == nullptr)
        object.AddMember(rapidjson::StringRef(key), JsonValue(rapidjson::kArrayType), document.GetAllocator());
    return object[key];
}

/// The name that a node has for the importer.
inline std::string nodeId(std::size_t index) {
    return "n" + std::to_string(index);
}

inline std::string element(const char* things, std::size_t index) {
    return std::string(things) + "[" + std::to_string(index) + "]";
}

} // namespace quarn
