// SPDX-License-Identifier: Apache-2.0
#include "values.h"

#include <algorithm>
#include <stdexcept>

namespace replay {

double readNumber(const Json& value) {
    if (!value.IsNumber())
        throw std::runtime_error("a number is of another type");
    return value.GetDouble();
}

std::size_t readCount(const Json& value) {
    if (!value.IsUint())
        throw std::runtime_error("a count is of another type");
    return value.GetUint();
}

bool readBool(const Json& value) {
    if (!value.IsBool())
        throw std::runtime_error("a truth value is of another type");
    return value.GetBool();
}

std::string readText(const Json& value) {
    if (!value.IsString())
        throw std::runtime_error("a text is of another type");
    return {value.GetString(), value.GetStringLength()};
}

quill::mat4d readMatrix(const Json& sixteenNumbers) {
    if (!sixteenNumbers.IsArray() || sixteenNumbers.Size() != 16)
        throw std::runtime_error("a matrix is not a list of 16 numbers");
    quill::mat4d matrix;
    for (rapidjson::SizeType k = 0; k < 16; ++k)
        matrix.m[k] = readNumber(sixteenNumbers[k]);
    return matrix;
}

std::vector<std::uint32_t> readIndices(const Json& list) {
    if (!list.IsArray())
        throw std::runtime_error("a list of indices is not a list");
    std::vector<std::uint32_t> indices;
    for (const Json& element : list.GetArray())
        indices.push_back(static_cast<std::uint32_t>(readCount(element)));
    return indices;
}

Json toJson(const std::string& value, JsonAllocator& allocator) {
    return Json(value.data(), static_cast<rapidjson::SizeType>(value.size()), allocator);
}

Json toJson(const quill::mat4d& matrix, JsonAllocator& allocator) {
    Json rows(rapidjson::kArrayType);
    for (std::size_t r = 0; r < 4; ++r) {
        Json row(rapidjson::kArrayType);
        for (std::size_t c = 0; c < 4; ++c)
            row.PushBack(matrix(r, c), allocator);
        rows.PushBack(row, allocator);
    }
    return rows;
}

std::vector<std::string> linesOf(const std::string& printed) {
    std::vector<std::string> lines;
    for (std::size_t begin = 0; begin < printed.size();) {
        const std::size_t end = std::min(printed.find('\n', begin), printed.size() - 1) + 1;
        lines.push_back(printed.substr(begin, end - begin));
        if (lines.back().rfind("Error: /", 0) == 0)
            lines.pop_back();
        begin = end;
    }
    return lines;
}

} // namespace replay
