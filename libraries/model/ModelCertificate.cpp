// SPDX-License-Identifier: Apache-2.0
#include "nw_model/ModelCertificate.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <stdexcept>
#include <utility>

#include "json.h"
#include "nw_model/ModelMetadata.h"
#include "nw_model/ModelSession.h"
#include "readers.h"
#include "storage/readWholeFile.h"

namespace neuralWarp {
namespace {

constexpr std::size_t mostErrors = 100;
constexpr std::size_t mostKnots = 1000;

[[noreturn]] void refuse(const std::string& member, const std::string& why) {
    throw std::runtime_error("certificate: " + member + " " + why);
}

// the member, or null where it is missing or null
const json::Value* memberOf(const json::Value& object, const char* key) {
    const json::Value* value = json::find(object, key);
    return value != nullptr && value->IsNull() ? nullptr : value;
}

const json::Value& objectOf(const json::Value& object, const char* key) {
    const json::Value* value = memberOf(object, key);
    if (value == nullptr || !value->IsObject())
        refuse(key, "is no object");
    return *value;
}

const json::Value& listOf(const json::Value& object, const char* key, std::size_t most) {
    const json::Value* value = memberOf(object, key);
    if (value == nullptr || !value->IsArray())
        refuse(key, "is no list");
    if (value->Size() > most)
        refuse(key, "has " + std::to_string(value->Size()) + " elements, and may have " + std::to_string(most));
    return *value;
}

double numberIn(const json::Value& value, const std::string& called) {
    const double number = value.IsNumber() ? value.GetDouble() : NAN;
    if (!std::isfinite(number))
        refuse(called, "is no finite number");
    return number;
}

template <class Number>
std::vector<Number> numbersOf(const json::Value& object, const char* key, std::size_t most) {
    std::vector<Number> numbers;
    for (const json::Value& value : listOf(object, key, most).GetArray()) {
        const std::string called = std::string(key) + "[" + std::to_string(numbers.size()) + "]";
        const double number = numberIn(value, called);
        if (std::abs(number) > double{std::numeric_limits<Number>::max()})
            refuse(called, "is too large");
        numbers.push_back(static_cast<Number>(number));
    }
    return numbers;
}

std::uint64_t countOf(const json::Value& object, const char* key) {
    const json::Value* value = memberOf(object, key);
    if (value == nullptr || !value->IsUint64())
        refuse(key, "is no whole number from 0");
    return value->GetUint64();
}

ErrorFigures figuresOf(const json::Value& stage, const std::string& called) {
    if (!stage.IsObject())
        refuse(called, "is no object");
    const auto figure = [&](const char* key) {
        const json::Value* value = json::find(stage, key);
        const std::string member = called + "." + key;
        const double number = value == nullptr ? NAN : numberIn(*value, member);
        if (!(number >= 0.0))
            refuse(member, "is no length");
        return number;
    };
    return {figure("mean"), figure("p99"), figure("p9999"), figure("max")};
}

CertifiedErrors errorsOf(const json::Value& row) {
    if (!row.IsObject())
        refuse("errors", "holds something that is no object");
    const json::Value& stages = objectOf(row, "mm");
    const auto stage = [&](const char* key) {
        const json::Value* value = memberOf(stages, key);
        return value == nullptr ? std::nullopt : std::optional(figuresOf(*value, key));
    };
    return {countOf(row, "frames"),
            json::readText(row, "heldOut"),
            json::readText(row, "poses"),
            figuresOf(objectOf(stages, "network"), "network"),
            stage("skin"),
            stage("zeroDeltas"),
            stage("basis")};
}

ControlRanges rangesOf(const json::Value& certificate) {
    const json::Value& controls = objectOf(certificate, "controls");
    return {numbersOf<float>(controls, "minima", modelInputLimit),
            numbersOf<float>(controls, "maxima", modelInputLimit)};
}

std::vector<std::string> namesOf(const json::Value& root, std::size_t count) {
    std::vector<std::string> names;
    for (const json::Value& name : listOf(root, "controlNames", modelInputLimit).GetArray())
        names.emplace_back(name.IsString() ? std::string(name.GetString(), name.GetStringLength()) : "?");
    if (names.size() != count)
        refuse("controls", "are " + std::to_string(count) + ", and controlNames " + std::to_string(names.size()));
    return names;
}

ModelCertificate certificateOf(const json::Value& root, const json::Value& certificate) {
    ModelCertificate read;
    read.ranges = rangesOf(certificate);
    read.controlNames = namesOf(root, read.ranges.count());
    read.trainingFrames = countOf(certificate, "trainingFrames");
    for (const json::Value& row : listOf(certificate, "errors", mostErrors).GetArray())
        read.errors.push_back(errorsOf(row));
    if (memberOf(certificate, "expectedError") != nullptr) {
        const json::Value& curve = objectOf(certificate, "expectedError");
        read.expected = {numbersOf<double>(curve, "distances", mostKnots),
                         numbersOf<double>(curve, "millimetres", mostKnots)};
    }
    if (memberOf(certificate, "trainedPoses") != nullptr)
        read.trainedPosesSum = json::readText(objectOf(certificate, "trainedPoses"), "xxh3_128");
    read.mesh = json::readText(certificate, "mesh");
    read.dataSet = json::readText(certificate, "dataSet");
    return read;
}

} // namespace

ExpectedError::ExpectedError(std::vector<double> distances, std::vector<double> millimetres)
    : distances_(std::move(distances))
    , millimetres_(std::move(millimetres)) {
    const auto isLength = [](double number) { return std::isfinite(number) && number >= 0.0; };
    if (distances_.size() != millimetres_.size() || distances_.empty())
        throw std::invalid_argument("expectedError has " + std::to_string(distances_.size()) + " distances and " +
                                    std::to_string(millimetres_.size()) + " errors");
    if (!std::all_of(distances_.begin(), distances_.end(), isLength) ||
        std::adjacent_find(distances_.begin(), distances_.end(), std::greater_equal<>()) != distances_.end())
        throw std::invalid_argument("expectedError has distances that do not rise from 0 or more");
    if (!std::all_of(millimetres_.begin(), millimetres_.end(), isLength) ||
        !std::is_sorted(millimetres_.begin(), millimetres_.end()))
        throw std::invalid_argument("expectedError has errors that fall, or are below 0");
}

double ExpectedError::at(double distance, double outside) const {
    const double growth = (1.0 + outside) * (1.0 + outside) * (1.0 + outside);
    const auto next = std::upper_bound(distances_.begin(), distances_.end(), distance);
    const auto index = static_cast<std::size_t>(next - distances_.begin());
    if (index == 0)
        return growth * millimetres_.front();
    if (next == distances_.end())
        return growth * millimetres_.back();
    const double before = distances_[index - 1];
    const double part = (distance - before) / (*next - before);
    return growth * (millimetres_[index - 1] + part * (millimetres_[index] - millimetres_[index - 1]));
}

std::optional<ModelCertificate> certificateIn(std::string_view text) {
    const json::Document root = storage::parseJson(text, storage::jsonRules::modelMetadata);
    if (!root.IsObject())
        throw std::runtime_error("it holds no JSON object");
    if (memberOf(root, "certificate") == nullptr)
        return {};
    try {
        return certificateOf(root, objectOf(root, "certificate"));
    } catch (const std::invalid_argument& error) {
        throw std::runtime_error("certificate: " + std::string(error.what()));
    }
}

std::optional<ModelCertificate> readCertificate(const std::filesystem::path& path) {
    return certificateIn(storage::readWholeFile(path, storage::jsonRules::modelMetadata.mostBytes));
}

} // namespace neuralWarp
