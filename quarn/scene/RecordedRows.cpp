// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/RecordedRows.h"

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
// but saving is a small part of all the time, on any disk: rows that come fast would wait for it more than they take
constexpr int workForSave = 40;

struct ProgressRecord {
    std::size_t rows = 0;
    std::vector<std::string> sums; ///< of each array
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

std::optional<ProgressRecord> readProgress(const std::filesystem::path& path, std::size_t arrays) try {
    const storage::JsonDocument json = storage::readJson(path, storage::jsonRules::dataset);
    if (!json.IsObject() || !json.HasMember("rows") || !json.HasMember("sums"))
        return {};
    const auto& rows = json["rows"];
    const auto& sums = json["sums"];
    if (!rows.IsUint64() || !sums.IsArray() || sums.Size() != arrays)
        return {};
    ProgressRecord record;
    record.rows = rows.GetUint64();
    for (const auto& sum : sums.GetArray()) {
        if (!sum.IsString())
            return {};
        record.sums.emplace_back(sum.GetString());
    }
    return record;
} catch (const std::runtime_error&) { // not there, or damaged
    return {};
}

} // namespace

RecordedRows::RecordedRows(const std::filesystem::path& folder, const std::vector<Array>& arrays)
    : progress_(folder / progressFile)
    , allRows_(arrays.front().layout.shape.front())
    , saved_(std::chrono::steady_clock::now()) {
    for (const Array& array : arrays) {
        files_.push_back(array.file);
        arrays_.emplace_back(folder / array.file, array.layout);
    }
}

void RecordedRows::begin() {
    for (storage::NpyRows& array : arrays_)
        array.begin();
    isOpen_ = true;
    rows_ = 0;
    record(std::chrono::steady_clock::now()); // of no rows, so that none have to be on the disk before
}

std::string RecordedRows::resume() {
    const std::optional<ProgressRecord> record = readProgress(progress_, arrays_.size());
    if (!record)
        return std::string(progressFile) + " cannot be read";
    if (record->rows > allRows_)
        return std::string(progressFile) + " speaks of " + std::to_string(record->rows) + " rows of " +
               std::to_string(allRows_);
    for (std::size_t i = 0; i < arrays_.size(); ++i)
        if (!arrays_[i].resume(record->rows, record->sums[i]))
            return files_[i] + " is damaged";
    isOpen_ = true;
    rows_ = savedRows_ = record->rows;
    return {};
}

void RecordedRows::append(std::initializer_list<std::span<const std::byte>> row) {
    if (rows_ == allRows_ || row.size() != arrays_.size())
        throw std::logic_error("a row that there is no place for");
    isOpen_ = false; // a part of a row is nothing to record
    auto array = arrays_.begin();
    for (const std::span<const std::byte> bytes : row)
        (array++)->append(bytes);
    isOpen_ = true;
    ++rows_;
    if (isTimeToSave())
        save();
}

bool RecordedRows::isTimeToSave() const {
    const auto since = std::chrono::steady_clock::now() - saved_;
    return since >= workForSave * saveTook_ && (rows_ - savedRows_ >= saveAfterRows || since >= saveAfter);
}

void RecordedRows::save() {
    if (!isOpen_)
        return;
    const auto begin = std::chrono::steady_clock::now();
    for (storage::NpyRows& array : arrays_)
        array.sync();
    record(begin);
}

void RecordedRows::record(std::chrono::steady_clock::time_point begin) {
    ProgressRecord record{rows_, {}};
    for (storage::NpyRows& array : arrays_)
        record.sums.push_back(array.sum());
    storage::writeWhole(progress_, textOf(record));
    savedRows_ = rows_;
    saved_ = std::chrono::steady_clock::now();
    saveTook_ = saved_ - begin;
}

} // namespace quarn
