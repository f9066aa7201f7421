// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/mergedDescription.h"

#include "quarn/dataset/exactNumbers.h"

#include <algorithm>
#include <array>
#include <stdexcept>
#include <string_view>

namespace quarn {
namespace {

constexpr const char* fitKey = "targetFit";
constexpr const char* drawnKey = "drawnFrames";
// of each part, or of the whole, and said anew
constexpr std::array<std::string_view, 4> ownKeys = {"frameCount", "controlRanges", fitKey, drawnKey};
constexpr std::string_view keyAfterThose = "train"; // what is there in some data sets only stands before it

bool isOwn(const storage::JsonValue& key) {
    return std::find(ownKeys.begin(), ownKeys.end(), storage::viewOf(key)) != ownKeys.end();
}

// a key in which `one` is not as `other`; empty without one
std::string differentKey(const storage::JsonDocument& one, const storage::JsonDocument& other) {
    for (const auto& member : one.GetObject()) {
        const auto found = other.FindMember(member.name);
        if (!isOwn(member.name) && (found == other.MemberEnd() || found->value != member.value))
            return std::string(storage::viewOf(member.name));
    }
    return {};
}

// to the byte as it was written, whatever it is
void writeValue(JsonWriter& writer, const storage::JsonValue& value) {
    if (value.IsObject()) {
        writer.StartObject();
        for (const auto& member : value.GetObject()) {
            writer.Key(member.name.GetString(), member.name.GetStringLength());
            writeValue(writer, member.value);
        }
        writer.EndObject();
    } else if (value.IsArray()) {
        writer.StartArray();
        for (const auto& element : value.GetArray())
            writeValue(writer, element);
        writer.EndArray();
    } else if (value.IsString())
        writeText(writer, std::string(storage::viewOf(value)));
    else if (value.IsBool())
        writer.Bool(value.GetBool());
    else if (value.IsNull())
        writer.Null();
    else if (value.IsInt64())
        writeNumber(writer, value.GetInt64());
    else
        writeNumber(writer, value.GetDouble());
}

double meanDistance(const storage::JsonDocument& fit) {
    const auto found = fit.IsObject() ? fit.FindMember("meanDistance") : fit.MemberEnd();
    return fit.IsObject() && found != fit.MemberEnd() && found->value.IsNumber() ? found->value.GetDouble() : -1.0;
}

storage::JsonDocument copyOf(const storage::JsonValue& value) {
    storage::JsonDocument copy;
    copy.CopyFrom(value, copy.GetAllocator());
    return copy;
}

} // namespace

void MergedDescription::add(DatasetPart part) {
    const storage::JsonDocument& description = part.description();
    if (first_)
        for (const std::string& key :
             {differentKey(first_->description(), description), differentKey(description, first_->description())})
            if (!key.empty())
                throw std::runtime_error(first_->folder().string() + " and " + part.folder().string() +
                                         " do not say the same in \"" + key + "\" of their dataset.json");
    addFit(description);
    addDrawn(description, part.frames().step);
    if (!first_)
        first_ = std::move(part);
}

void MergedDescription::addFit(const storage::JsonDocument& description) {
    const auto found = description.FindMember(fitKey);
    storage::JsonDocument fit = found == description.MemberEnd() ? storage::JsonDocument() : copyOf(found->value);
    if (!first_) {
        fit_ = std::move(fit);
        return;
    }
    agreesInFit_ = agreesInFit_ && fit == fit_;
    if (!ofWhole_ && meanDistance(fit) > meanDistance(fit_))
        fit_ = std::move(fit);
}

void MergedDescription::addDrawn(const storage::JsonDocument& description, int step) {
    const auto found = description.FindMember(drawnKey);
    if (found == description.MemberEnd() || !found->value.IsArray() || (ofWhole_ && first_))
        return;
    for (const storage::JsonValue& span : found->value.GetArray()) {
        if (!span.IsArray() || span.Size() != 2 || !span[0].IsInt() || !span[1].IsInt())
            throw std::runtime_error("\"drawnFrames\" in a dataset.json is no list of pairs of frames");
        if (!drawn_.empty() && span[0].GetInt() <= drawn_.back().second + step)
            drawn_.back().second = span[1].GetInt();
        else
            drawn_.emplace_back(span[0].GetInt(), span[1].GetInt());
    }
}

std::string MergedDescription::text(std::size_t rows, const std::vector<ControlRange>& ranges) const {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.SetFormatOptions(rapidjson::kFormatSingleLineArray);
    writer.StartObject();
    for (const auto& member : first_->description().GetObject()) {
        const std::string_view key = storage::viewOf(member.name);
        if (key == keyAfterThose && !fit_.IsNull()) {
            writer.Key(fitKey);
            writeValue(writer, fit_);
        }
        if (key == keyAfterThose && !drawn_.empty()) {
            writer.Key(drawnKey);
            writer.StartArray();
            for (const auto& span : drawn_) {
                writer.StartArray();
                writer.Int(span.first);
                writer.Int(span.second);
                writer.EndArray();
            }
            writer.EndArray();
        }
        if (key == fitKey || key == drawnKey)
            continue;
        writer.Key(member.name.GetString(), member.name.GetStringLength());
        if (key == "frameCount")
            writer.Uint64(rows);
        else if (key == "controlRanges")
            writeRanges(writer, ranges);
        else
            writeValue(writer, member.value);
    }
    writer.EndObject();
    return buffer.GetString() + std::string("\n");
}

} // namespace quarn
