// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/PartRecord.h"

#include "quarn/console/build.h"
#include "quarn/console/json.h"
#include "storage/ByteSum.h"
#include "storage/FileError.h"
#include "storage/Json.h"

#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* format = "neuralWarp part";
constexpr unsigned version = 1;

[[noreturn]] void refuse(const char* key) {
    throw std::runtime_error("its \"" + std::string(key) + "\" is missing, or is none");
}

const storage::JsonValue& member(const storage::JsonValue& object, const char* key) {
    const auto found = object.FindMember(key);
    if (found == object.MemberEnd())
        refuse(key);
    return found->value;
}

std::string text(const storage::JsonValue& object, const char* key) {
    const storage::JsonValue& value = member(object, key);
    if (!value.IsString())
        refuse(key);
    return std::string(storage::viewOf(value));
}

PartRecord recordFrom(const storage::JsonValue& object) {
    if (!object.IsObject() || text(object, "format") != format)
        throw std::runtime_error("its \"format\" is not \"" + std::string(format) + "\"");
    if (const storage::JsonValue& number = member(object, "version"); !number.IsUint() || number.GetUint() != version)
        throw std::runtime_error("its \"version\" is not " + std::to_string(version));
    PartRecord record;
    record.build = text(object, "build");
    record.quarn = text(object, "quarn");
    record.frames = frameRange(text(object, "frames"));
    record.of = frameRange(text(object, "of"));
    record.firstSum = text(object, "firstSum");
    if (!member(object, "nextSum").IsNull())
        record.nextSum = text(object, "nextSum");
    record.instructionSet = text(object, "instructionSet");
    record.setupSum = text(object, "setupSum");
    if (object.HasMember("setup")) {
        record.setup = Setup::from(object["setup"]);
        if (!record.setup)
            refuse("setup");
    }
    return record;
}

} // namespace

fs::path PartRecord::besideCache(const fs::path& cache) {
    return cache.string() + ".part.json";
}

PartRecord PartRecord::made(const PartFrames& frames, const Setup& setup) {
    PartRecord record;
    record.build = buildId();
    record.quarn = QUARN_VERSION;
    record.instructionSet = quarn::instructionSet();
    record.frames = frames.frames;
    record.of = frames.whole;
    const std::string bytes = setup.without(setupEntry::part).json();
    record.setupSum = rowSum({std::as_bytes(std::span(bytes))});
    return record;
}

std::string PartRecord::json() const {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "format", format);
    writeCount(writer, "version", version);
    writeText(writer, "build", build);
    writeText(writer, "quarn", quarn);
    writeText(writer, "frames", frameText(frames));
    writeText(writer, "of", frameText(of));
    writeText(writer, "firstSum", firstSum);
    writer.Key("nextSum");
    if (nextSum)
        writeText(writer, *nextSum);
    else
        writer.Null();
    writeText(writer, "instructionSet", instructionSet);
    writeText(writer, "setupSum", setupSum);
    if (setup) {
        writer.Key("setup");
        setup->write(writer);
    }
    writer.EndObject();
    return buffer.GetString() + std::string("\n");
}

std::optional<PartRecord> PartRecord::read(const fs::path& file) {
    std::error_code none;
    if (!fs::exists(file, none))
        return {};
    try {
        return recordFrom(storage::readJson(file, storage::jsonRules::dataset));
    } catch (const storage::FileError&) {
        throw;
    } catch (const std::runtime_error& why) {
        throw storage::FileError(file, "is no record of a part: " + std::string(why.what()));
    }
}

std::string rowSum(std::initializer_list<std::span<const std::byte>> pieces) {
    storage::ByteSum sum;
    for (const std::span<const std::byte> piece : pieces)
        sum.add(piece);
    return rowSumKind + sum.digits();
}

} // namespace quarn
