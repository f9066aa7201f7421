// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/DatasetWriter.h"

#include "quarn/console/json.h"
#include "storage/Json.h"
#include "storage/WholeFile.h"

#include <optional>
#include <stdexcept>

namespace quarn {
namespace {

// at most so much is lost, and made again, when the program dies
constexpr std::size_t saveAfterRows = 64;
constexpr auto saveAfter = std::chrono::seconds(1);

struct ProgressRecord {
    std::size_t rows = 0;
    std::array<std::string, 4> sums;
};

std::string textOf(const ProgressRecord& record) {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writer.Key("rows");
    writer.Uint64(record.rows);
    writer.Key("sums");
    writer.StartArray();
    for (const std::string& sum : record.sums)
        writeText(writer, sum);
    writer.EndArray();
    writer.EndObject();
    return buffer.GetString() + std::string("\n");
}

std::optional<ProgressRecord> readProgress(const std::filesystem::path& path) try {
    const storage::JsonDocument json = storage::readJson(path, storage::jsonRules::dataset);
    if (!json.IsObject() || !json.HasMember("rows") || !json.HasMember("sums"))
        return {};
    const auto& rows = json["rows"];
    const auto& sums = json["sums"];
    ProgressRecord record;
    if (!rows.IsUint64() || !sums.IsArray() || sums.Size() != record.sums.size())
        return {};
    record.rows = rows.GetUint64();
    for (rapidjson::SizeType i = 0; i < sums.Size(); ++i) {
        if (!sums[i].IsString())
            return {};
        record.sums[i] = sums[i].GetString();
    }
    return record;
} catch (const std::runtime_error&) { // not there, or damaged
    return {};
}

} // namespace

DatasetWriter::DatasetWriter(const std::filesystem::path& folder, const DatasetShape& shape)
    : progress_(folder / datasetFile::progress)
    , shape_(shape)
    , controls_(folder / datasetFile::controls, {"<f4", {shape.rows, shape.controls}})
    , deltas_(folder / datasetFile::deltas, {"<f4", {shape.rows, shape.deltas, 3}})
    , frames_(folder / datasetFile::frames, {"<i4", {shape.rows}})
    , skin_(folder / datasetFile::skin, {"<f4", {shape.rows, shape.deltas}})
    , saved_(std::chrono::steady_clock::now()) {}

void DatasetWriter::begin() {
    for (storage::NpyRows* file : {&controls_, &deltas_, &frames_, &skin_})
        file->begin();
    isOpen_ = true;
    rows_ = 0;
    save();
}

std::string DatasetWriter::resume() {
    const std::optional<ProgressRecord> record = readProgress(progress_);
    if (!record)
        return std::string(datasetFile::progress) + " cannot be read";
    if (record->rows > shape_.rows)
        return std::string(datasetFile::progress) + " speaks of " + std::to_string(record->rows) + " rows of " +
               std::to_string(shape_.rows);
    if (!controls_.resume(record->rows, record->sums[0]))
        return std::string(datasetFile::controls) + " is damaged";
    if (!deltas_.resume(record->rows, record->sums[1]))
        return std::string(datasetFile::deltas) + " is damaged";
    if (!frames_.resume(record->rows, record->sums[2]))
        return std::string(datasetFile::frames) + " is damaged";
    if (!skin_.resume(record->rows, record->sums[3]))
        return std::string(datasetFile::skin) + " is damaged";
    isOpen_ = true;
    rows_ = savedRows_ = record->rows;
    return {};
}

void DatasetWriter::append(int frame, std::span<const float> controls, std::span<const float> deltas,
                           std::span<const float> skin) {
    if (controls.size() != shape_.controls || deltas.size() != 3 * shape_.deltas || skin.size() != shape_.deltas ||
        rows_ == shape_.rows)
        throw std::logic_error("a row that the data set has no place for");
    isOpen_ = false; // a part of a row is nothing to record
    controls_.append(std::as_bytes(controls));
    deltas_.append(std::as_bytes(deltas));
    frames_.append(std::as_bytes(std::span(&frame, 1)));
    skin_.append(std::as_bytes(skin));
    isOpen_ = true;
    ++rows_;
    if (rows_ - savedRows_ >= saveAfterRows || std::chrono::steady_clock::now() - saved_ >= saveAfter)
        save();
}

void DatasetWriter::save() {
    if (!isOpen_)
        return;
    for (storage::NpyRows* file : {&controls_, &deltas_, &frames_, &skin_})
        file->sync();
    storage::writeWhole(progress_, textOf({rows_, {controls_.sum(), deltas_.sum(), frames_.sum(), skin_.sum()}}));
    savedRows_ = rows_;
    saved_ = std::chrono::steady_clock::now();
}

} // namespace quarn
