// SPDX-License-Identifier: Apache-2.0
// The recording as a file: the "Trace Event Format", JSON object form, complete events ("ph": "X").
#include "openquarn_app/Profiling.h"
#include "services/ProfilingRecords.h"
#include "storage/WholeFile.h"
#include "storage/encodings.h"

#include <rapidjson/ostreamwrapper.h>
#include <rapidjson/writer.h>

#include <array>
#include <ostream>

namespace OpenQuarn {
namespace {

using JsonWriter = rapidjson::Writer<rapidjson::OStreamWrapper>;

// names that the viewers reserve for their palette
constexpr std::array<const char*, 16> palette = {"thread_state_running",
                                                 "thread_state_runnable",
                                                 "rail_response",
                                                 "rail_animation",
                                                 "rail_idle",
                                                 "rail_load",
                                                 "startup",
                                                 "good",
                                                 "bad",
                                                 "terrible",
                                                 "yellow",
                                                 "olive",
                                                 "generic_work",
                                                 "grey",
                                                 "black",
                                                 "white"};

/// The bytes of a text as one code point each, which is what can be shown of a text that is not UTF-8.
std::string bytesAsUtf8(const std::string& text) {
    std::string converted;
    converted.reserve(2 * text.size());
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte >= 0x80)
            converted += static_cast<char>(0xC0 | (byte >> 6));
        converted += static_cast<char>(byte >= 0x80 ? 0x80 | (byte & 0x3F) : byte);
    }
    return converted;
}

void writeText(JsonWriter& json, const char* key, const std::string& text) {
    const std::string shown = storage::isUtf8(text) ? text : bytesAsUtf8(text);
    json.Key(key);
    json.String(shown.data(), static_cast<rapidjson::SizeType>(shown.size()));
}

void writeNumber(JsonWriter& json, const char* key, double number) {
    json.Key(key);
    json.Double(number);
}

void writeThread(JsonWriter& json, unsigned thread) {
    json.Key("pid");
    json.Int(1);
    json.Key("tid");
    json.Uint(thread);
}

const char* paletteName(int colorIndex) {
    const auto size = static_cast<int>(palette.size());
    return palette[static_cast<std::size_t>((colorIndex % size + size) % size)];
}

double microseconds(std::chrono::steady_clock::duration duration) {
    return std::chrono::duration<double, std::micro>(duration).count();
}

void writeRecord(JsonWriter& json, const ProfilingRecord& record, unsigned thread,
                 std::chrono::steady_clock::time_point begin) {
    json.StartObject();
    writeText(json, "ph", "X");
    writeText(json, "name", record.eventName);
    const std::string* category = profiling::categoryName(record.category);
    writeText(json, "cat", category ? *category : "");
    writeThread(json, thread);
    writeNumber(json, "ts", microseconds(record.begin - begin));
    writeNumber(json, "dur", microseconds(record.end - record.begin));
    writeText(json, "cname", paletteName(record.colorIndex));
    json.Key("args");
    json.StartObject();
    writeText(json, "description", record.description);
    json.Key("color");
    json.Int(record.colorIndex);
    json.EndObject();
    json.EndObject();
}

void writeThreadName(JsonWriter& json, unsigned thread) {
    json.StartObject();
    writeText(json, "ph", "M");
    writeText(json, "name", "thread_name");
    writeThread(json, thread);
    json.Key("args");
    json.StartObject();
    writeText(json, "name", "thread " + std::to_string(thread));
    json.EndObject();
    json.EndObject();
}

/// Writes the events and gives the number of records that were dropped.
std::size_t writeEvents(JsonWriter& json, const std::vector<ThreadRecords>& threads) {
    const auto begin = profiling::recordingBegin();
    std::size_t dropped = 0;
    for (const ThreadRecords& thread : threads) {
        if (!thread.records.empty())
            writeThreadName(json, thread.thread);
        for (const ProfilingRecord& record : thread.records)
            writeRecord(json, record, thread.thread, begin);
        dropped += thread.dropped;
    }
    return dropped;
}

void writeDocument(std::ostream& out) {
    rapidjson::OStreamWrapper stream(out);
    JsonWriter json(stream);
    json.StartObject();
    writeText(json, "displayTimeUnit", "ms");
    json.Key("traceEvents");
    json.StartArray();
    const std::size_t dropped = writeEvents(json, profiling::keptRecords());
    json.EndArray();
    json.Key("otherData");
    json.StartObject();
    json.Key("dropped");
    json.Uint64(dropped);
    json.EndObject();
    json.EndObject();
}

} // namespace

void Profiling::writeTrace(std::ostream& stream) {
    writeDocument(stream);
}

void Profiling::writeTrace(const std::filesystem::path& path) {
    storage::WholeFile file(path);
    writeDocument(file.stream());
    file.finish();
}

} // namespace OpenQuarn
