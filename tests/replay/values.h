// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Case.h"

#include "quill/mat4d.h"
#include "quill/val3.h"

#include <cstdint>
#include <string>
#include <type_traits>
#include <vector>

// Between the JSON of the cases and the library's types. The readers throw std::runtime_error on another type.
namespace replay {

double readNumber(const Json& value);
std::size_t readCount(const Json& value);
bool readBool(const Json& value);
std::string readText(const Json& value);
quill::mat4d readMatrix(const Json& sixteenNumbers);
std::vector<std::uint32_t> readIndices(const Json& list);

template <typename T>
quill::val3<T> readVector(const Json& list) {
    if (!list.IsArray() || list.Size() != 3)
        throw std::runtime_error("a vector is not a list of three numbers");
    return {static_cast<T>(readNumber(list[0])), static_cast<T>(readNumber(list[1])),
            static_cast<T>(readNumber(list[2]))};
}

template <typename T>
std::vector<quill::val3<T>> readVectors(const Json& list) {
    if (!list.IsArray())
        throw std::runtime_error("a list of vectors is not a list");
    std::vector<quill::val3<T>> vectors;
    for (const Json& element : list.GetArray())
        vectors.push_back(readVector<T>(element));
    return vectors;
}

template <typename T>
requires std::is_arithmetic_v<T> Json toJson(T value, JsonAllocator&) {
    return Json(value);
}
Json toJson(const std::string& value, JsonAllocator& allocator);
Json toJson(const quill::mat4d& matrix, JsonAllocator& allocator); // four rows

template <typename T>
Json toJson(const quill::val3<T>& v, JsonAllocator& allocator) {
    Json list(rapidjson::kArrayType);
    for (std::size_t i = 0; i < 3; ++i)
        list.PushBack(toJson(v[i], allocator), allocator);
    return list;
}

template <typename T>
Json toJson(const std::vector<T>& values, JsonAllocator& allocator) {
    Json list(rapidjson::kArrayType);
    for (const auto& value : values)
        list.PushBack(toJson(value, allocator), allocator);
    return list;
}

// The lines of what was printed, with their line ends. Without those in which the readers of model files say why they
// refuse a file that cases say nothing about: "Error: PATH: REASON".
std::vector<std::string> linesOf(const std::string& printed);

// Builds the object of actual values.
class Output {
public:
    explicit Output(JsonAllocator& allocator)
        : allocator_(allocator) {}

    template <typename T>
    void set(const char* key, const T& value) {
        object_.AddMember(rapidjson::StringRef(key), toJson(value, allocator_), allocator_);
    }
    void set(const char* key, Json value) { object_.AddMember(rapidjson::StringRef(key), value.Move(), allocator_); }

    Json take() { return std::move(object_); }

private:
    JsonAllocator& allocator_;
    Json object_{rapidjson::kObjectType};
};

} // namespace replay
