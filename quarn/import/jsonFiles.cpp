// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/jsonFiles.h"

#include "quarn/console/json.h"
#include "storage/Json.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>
#include <variant>

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
            fail("it stands twice");
        map[name] = read(member.value, fail);
    }
    return map;
}

template <class Fail>
ValueRange readRange(const storage::JsonValue& range, const std::string& axis, double unit, Fail fail) {
    const std::string what = axis.empty() ? "" : axis + ": ";
    if (!range.IsArray() || range.Size() != 2 || !range[0].IsNumber() || !range[1].IsNumber())
        fail(what + "not [least, largest]" + (axis.empty() ? "" : " in degrees"));
    const double least = range[0].GetDouble();
    const double largest = range[1].GetDouble();
    if (!(least < largest))
        fail(what + "the first of the two numbers must be below the second");
    return {least * unit, largest * unit};
}

template <class Fail>
JointLimits readAxes(const storage::JsonValue& axes, Fail fail) {
    JointLimits limits;
    for (const auto& member : axes.GetObject()) {
        const std::string axis(storage::viewOf(member.name));
        const auto known = std::find(axisNames.begin(), axisNames.end(), axis);
        if (known == axisNames.end())
            fail("\"" + axis + "\" is not one of rotateX, rotateY and rotateZ");
        limits[static_cast<std::size_t>(known - axisNames.begin())] =
            readRange(member.value, axis, radiansPerDegree, fail);
    }
    return limits;
}

// away from what lies between; a hair less than a digit is the rounding of radians
double outwards(double value, double direction) {
    constexpr double digits = 1e4;
    constexpr double hair = 1e-6;
    return direction * std::ceil(direction * value * digits - hair) / digits + 0.0; // no -0
}

void writeRange(JsonWriter& json, const std::string& key, const ValueRange& range, double unit) {
    json.Key(key.c_str());
    json.StartArray();
    json.Double(outwards(range.first / unit, -1.0));
    json.Double(outwards(range.second / unit, 1.0));
    json.EndArray();
}

} // namespace

std::string limitsText(const std::vector<std::pair<std::string, JointLimits>>& joints,
                       const std::vector<std::pair<std::string, ValueRange>>& sliders) {
    rapidjson::StringBuffer buffer;
    JsonWriter json(buffer);
    json.SetFormatOptions(rapidjson::kFormatSingleLineArray);
    json.StartObject();
    for (const auto& [name, limits] : joints) {
        writeText(json, name);
        json.StartObject();
        for (std::size_t axis = 0; axis < limits.size(); ++axis)
            if (limits.at(axis))
                writeRange(json, axisNames.at(axis), *limits.at(axis), radiansPerDegree);
        json.EndObject();
    }
    for (const auto& [name, range] : sliders)
        writeRange(json, name, range, 1.0);
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

PoseLimits readLimits(const fs::path& file) {
    using Limits = std::variant<JointLimits, ValueRange>;
    const auto read = [](const storage::JsonValue& value, auto fail) -> Limits {
        if (value.IsArray())
            return readRange(value, "", 1.0, fail);
        if (!value.IsObject())
            fail("neither an object of axes, as in {\"rotateX\": [-90, 10]}, nor [least, largest] of a slider");
        return readAxes(value, fail);
    };
    PoseLimits limits;
    for (const auto& [name, value] : readMembers<std::map<std::string, Limits>>(file, read))
        if (const auto* axes = std::get_if<JointLimits>(&value))
            limits.joints[name] = *axes;
        else
            limits.sliders[name] = std::get<ValueRange>(value);
    return limits;
}

} // namespace quarn
