// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/DatasetPart.h"

#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/rowSums.h"
#include "storage/ArrayFile.h"
#include "storage/FileError.h"
#include "storage/npyArray.h"

#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// numbers are written again as they are
constexpr storage::JsonRules exactRules = [] {
    storage::JsonRules rules = storage::jsonRules::dataset;
    rules.isExact = true;
    return rules;
}();

fs::path folderOfComplete(const fs::path& folder) {
    std::error_code none;
    const fs::path begun = folder.string() + ".part";
    if (folder.extension() == ".part")
        throw std::runtime_error(folder.string() +
                                 " is a data set that was begun, and is not complete; the export that made it goes on");
    if (fs::exists(folder / descriptionFile, none))
        return folder;
    if (fs::exists(begun, none))
        throw std::runtime_error(folder.string() + " is not complete: there is " + begun.string() +
                                 ", and the export that made it goes on from there");
    if (!fs::exists(folder, none))
        throw std::runtime_error(folder.string() + " does not exist");
    throw std::runtime_error(folder.string() + (fs::is_directory(folder, none)
                                                    ? " is no training data set"
                                                    : " is no folder of a data set, and no .npy cache"));
}

std::size_t count(const fs::path& file, const storage::JsonDocument& json, const char* key) {
    if (!json.IsObject() || !json.HasMember(key) || !json[key].IsUint())
        throw storage::FileError(file, std::string("has no \"") + key + "\" that is a number");
    return json[key].GetUint();
}

Setup readSetup(const fs::path& folder) {
    std::optional<Setup> setup = Setup::read(folder / setupFile);
    if (!setup || !setup->value(setupEntry::frames))
        throw storage::FileError(folder / setupFile, "is missing, or is no set-up of an export");
    return *std::move(setup);
}

} // namespace

DatasetPart::DatasetPart(const fs::path& folder)
    : folder_(folderOfComplete(folder))
    , setup_(readSetup(folder))
    , description_(storage::readJson(folder / descriptionFile, exactRules))
    , record_(PartRecord::read(folder / PartRecord::fileName)) {
    const fs::path file = folder / descriptionFile;
    shape_ = {count(file, description_, "frameCount"), count(file, description_, "controlCount"),
              count(file, description_, "deltaCount")};
}

FrameRange DatasetPart::frames() const {
    return record_ ? record_->frames : frameRange(*setup_.value(setupEntry::frames));
}

void DatasetPart::check() const {
    const std::uint64_t rows = frames().count();
    if (shape_.rows != rows)
        throw storage::FileError(folder_ / descriptionFile, "speaks of " + std::to_string(shape_.rows) +
                                                                " rows, where frames " + frameText(frames()) + " are " +
                                                                std::to_string(rows));
    requireArray(datasetFile::controls, "<f4", {rows, shape_.controls});
    requireArray(datasetFile::deltas, "<f4", {rows, shape_.deltas, 3});
    requireArray(datasetFile::frames, "<i4", {rows});
    requireArray(datasetFile::skin, "<f4", {rows, shape_.deltas});
    requireFrames();
    if (!record_)
        return;
    const std::string setup = setup_.without(setupEntry::part).json();
    if (record_->setupSum != rowSum({std::as_bytes(std::span(setup))}) ||
        setup_.value(setupEntry::part) != frameText(record_->frames) ||
        setup_.value(setupEntry::frames) != frameText(record_->of))
        throw std::runtime_error(std::string(PartRecord::fileName) + " and " + setupFile + " in " + folder_.string() +
                                 " do not belong together");
    if (record_->firstSum != firstRowSum(folder_, shape_))
        throw std::runtime_error(folder_.string() +
                                 " is damaged: its first row is not the one that its record speaks of");
}

void DatasetPart::requireArray(const char* name, const char* type, const std::vector<std::uint64_t>& shape) const {
    const fs::path path = folder_ / name;
    const storage::ArrayFile file(path);
    if (file.array().descr != type || file.array().shape != shape)
        throw storage::FileError(path, "is damaged: it has numbers '" + file.array().descr + "' in the shape " +
                                           storage::npyShapeText(file.array().shape) + ", where '" + type + "' in " +
                                           storage::npyShapeText(shape) + " are meant");
}

void DatasetPart::requireFrames() const {
    const fs::path path = folder_ / datasetFile::frames;
    const std::vector<std::int32_t> found = storage::readIntegers(path);
    const FrameRange meant = frames();
    for (std::size_t row = 0; row < found.size(); ++row)
        if (found[row] != meant.frame(row))
            throw storage::FileError(path, "is damaged: row " + std::to_string(row) + " is of frame " +
                                               std::to_string(found[row]) + ", where " +
                                               std::to_string(meant.frame(row)) + " is meant");
}

} // namespace quarn
