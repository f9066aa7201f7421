// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/jsonFiles.h"

#include "storage/readWholeFile.h"

#include <rapidjson/document.h>
#include <rapidjson/error/en.h>

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr std::array<const char*, 3> axisNames = {"rotateX", "rotateY", "rotateZ"};
constexpr std::uint64_t largestFile = std::uint64_t{64} << 20U;
constexpr double radiansPerDegree = 3.14159265358979323846 / 180.0;

std::string textOf(const rapidjson::Value& value) {
    return {value.GetString(), value.GetStringLength()};
}

std::size_t lineOf(const std::string& text, std::size_t offset) {
    const auto end = text.begin() + static_cast<std::ptrdiff_t>(std::min(offset, text.size()));
    return static_cast<std::size_t>(std::count(text.begin(), end, '\n')) + 1;
}

rapidjson::Document readObject(const fs::path& file) {
    const std::string text = storage::readWholeFile(file, largestFile);
    rapidjson::Document document;
    document.Parse<rapidjson::kParseIterativeFlag>(text.data(), text.size());
    if (document.HasParseError())
        throw std::runtime_error(file.string() + ": line " + std::to_string(lineOf(text, document.GetErrorOffset())) +
                                 ": " + rapidjson::GetParseError_En(document.GetParseError()));
    if (!document.IsObject())
        throw std::runtime_error(file.string() + ": the file holds no JSON object");
    return document;
}

// adds what a reader makes of every member; its errors get the file and the member in front
template <class Map, class Read>
Map readMembers(const fs::path& file, Read read) {
    Map map;
    const rapidjson::Document document = readObject(file);
    for (const auto& member : document.GetObject()) {
        const std::string name = textOf(member.name);
        const auto fail = [&](const std::string& why) {
            throw std::runtime_error(file.string() + ": \"" + name + "\": " + why);
        };
        if (map.count(name) > 0)
            fail("the joint stands twice");
        map[name] = read(member.value, fail);
    }
    return map;
}

template <class Fail>
std::pair<double, double> readRange(const rapidjson::Value& range, const std::string& axis, Fail fail) {
    if (!range.IsArray() || range.Size() != 2 || !range[0].IsNumber() || !range[1].IsNumber())
        fail(axis + " is not [least, largest] in degrees");
    const double least = range[0].GetDouble();
    const double largest = range[1].GetDouble();
    if (!(least < largest))
        fail(axis + ": the first of the two angles must be below the second");
    return {least * radiansPerDegree, largest * radiansPerDegree};
}

} // namespace

ParentMap readParents(const fs::path& file) {
    return readMembers<ParentMap>(file, [](const rapidjson::Value& value, auto fail) {
        if (!value.IsString())
            fail("its parent is not a text");
        return textOf(value);
    });
}

LimitMap readLimits(const fs::path& file) {
    return readMembers<LimitMap>(file, [](const rapidjson::Value& value, auto fail) {
        if (!value.IsObject())
            fail("not an object of axes, as in {\"rotateX\": [-90, 10]}");
        JointLimits limits;
        for (const auto& member : value.GetObject()) {
            const std::string axis = textOf(member.name);
            const auto known = std::find(axisNames.begin(), axisNames.end(), axis);
            if (known == axisNames.end())
                fail("\"" + axis + "\" is not one of rotateX, rotateY and rotateZ");
            limits[static_cast<std::size_t>(known - axisNames.begin())] = readRange(member.value, axis, fail);
        }
        return limits;
    });
}

} // namespace quarn
