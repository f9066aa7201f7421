// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/jsonFiles.h"

#include "quarn/console/json.h"
#include "storage/Json.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr std::array<const char*, 3> axisNames = {"rotateX", "rotateY", "rotateZ"};
constexpr double radiansPerDegree = 3.14159265358979323846 / 180.0;

storage::JsonDocument readObject(const fs::path& file) {
    storage::JsonDocument document = storage::readJson(file, storage::jsonRules::joints);
    if (!document.IsObject())
        throw std::runtime_error(file.string() + ": the file holds no JSON object");
    return document;
}

// adds what a reader makes of every member; its errors get the file and the member in front
template <class Map, class Read>
Map readMembers(const fs::path& file, Read read) {
    Map map;
    const storage::JsonDocument document = readObject(file);
    for (const auto& member : document.GetObject()) {
        const std::string name(storage::viewOf(member.name));
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
std::pair<double, double> readRange(const storage::JsonValue& range, const std::string& axis, Fail fail) {
    if (!range.IsArray() || range.Size() != 2 || !range[0].IsNumber() || !range[1].IsNumber())
        fail(axis + " is not [least, largest] in degrees");
    const double least = range[0].GetDouble();
    const double largest = range[1].GetDouble();
    if (!(least < largest))
        fail(axis + ": the first of the two angles must be below the second");
    return {least * radiansPerDegree, largest * radiansPerDegree};
}

// away from what lies between; a hair less than a digit is the rounding of radians
double outwards(double radians, double direction) {
    constexpr double digits = 1e4;
    constexpr double hair = 1e-6;
    const double degrees = radians / radiansPerDegree;
    return direction * std::ceil(direction * degrees * digits - hair) / digits + 0.0; // no -0
}

} // namespace

std::string limitsText(const std::vector<std::pair<std::string, JointLimits>>& joints) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.SetFormatOptions(rapidjson::kFormatSingleLineArray);
    json.StartObject();
    for (const auto& [name, limits] : joints) {
        writeText(json, name);
        json.StartObject();
        for (std::size_t axis = 0; axis < limits.size(); ++axis) {
            if (!limits.at(axis))
                continue;
            json.Key(axisNames.at(axis));
            json.StartArray();
            json.Double(outwards(limits.at(axis)->first, -1.0));
            json.Double(outwards(limits.at(axis)->second, 1.0));
            json.EndArray();
        }
        json.EndObject();
    }
    json.EndObject();
    return std::string(buffer.GetString()) + "\n";
}

ParentMap readParents(const fs::path& file) {
    return readMembers<ParentMap>(file, [](const storage::JsonValue& value, auto fail) {
        if (!value.IsString())
            fail("its parent is not a text");
        return std::string(storage::viewOf(value));
    });
}

LimitMap readLimits(const fs::path& file) {
    return readMembers<LimitMap>(file, [](const storage::JsonValue& value, auto fail) {
        if (!value.IsObject())
            fail("not an object of axes, as in {\"rotateX\": [-90, 10]}");
        JointLimits limits;
        for (const auto& member : value.GetObject()) {
            const std::string axis(storage::viewOf(member.name));
            const auto known = std::find(axisNames.begin(), axisNames.end(), axis);
            if (known == axisNames.end())
                fail("\"" + axis + "\" is not one of rotateX, rotateY and rotateZ");
            limits[static_cast<std::size_t>(known - axisNames.begin())] = readRange(member.value, axis, fail);
        }
        return limits;
    });
}

} // namespace quarn
