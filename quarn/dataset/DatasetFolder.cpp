// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/DatasetFolder.h"

#include "quarn/dataset/DatasetWriter.h"
#include "quarn/dataset/roomOnDisk.h"
#include "quarn/scene/PartRecord.h"
#include "storage/Folder.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <array>
#include <stdexcept>
#include <system_error>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// stands in a data set that is about to be replaced, and then in FOLDER.part: what is there is nothing to go on from
constexpr const char* supersededFile = "superseded";
constexpr std::array ourFiles = {datasetFile::controls, datasetFile::deltas,   datasetFile::frames,
                                 datasetFile::skin,     descriptionFile,       setupFile,
                                 PartRecord::fileName,  datasetFile::progress, storage::FolderLock::fileName,
                                 supersededFile};

bool isOneOf(const std::string& name, const char* file) {
    return name == file || storage::TemporaryFile::isOf(name, file);
}

void removeFile(const fs::path& file) {
    std::error_code error;
    fs::remove_all(file, error);
    if (error)
        throw std::runtime_error(file.string() + " could not be removed: " + error.message());
}

// what belongs to the making of a data set, and not to it
bool isTool(const std::string& name) {
    const auto isBegun = [&](const char* file) { return name != file && isOneOf(name, file); };
    return name == datasetFile::progress || name == storage::FolderLock::fileName || name == supersededFile ||
           std::any_of(ourFiles.begin(), ourFiles.end(), isBegun);
}

// all but the lock, which goes with its owner
void removeTools(const fs::path& folder) {
    std::vector<fs::path> tools;
    for (const fs::directory_entry& entry : fs::directory_iterator(folder))
        if (const std::string name = entry.path().filename(); isTool(name) && name != storage::FolderLock::fileName)
            tools.push_back(entry.path());
    std::for_each(tools.begin(), tools.end(), removeFile);
}

// what one that was killed while it published has left
void removeLeftTools(const fs::path& folder) {
    const bool isLeft = std::any_of(fs::directory_iterator(folder), {},
                                    [](const fs::directory_entry& entry) { return isTool(entry.path().filename()); });
    if (!isLeft || storage::FolderLock::isTaken(folder))
        return;
    const storage::FolderLock lock(folder, anotherExport);
    removeTools(folder);
}

fs::path withoutLinks(const fs::path& path) {
    std::error_code error;
    fs::path real = fs::weakly_canonical(path, error);
    if (error)
        real = path.lexically_normal();
    return real.filename().empty() ? real.parent_path() : real; // "folder/" is "folder"
}

} // namespace

DatasetFolder::DatasetFolder(const fs::path& folder, bool replaces)
    : folder_(withoutLinks(folder))
    , part_(folder_.string() + ".part")
    , replaces_(replaces) {}

bool DatasetFolder::isDone(const Setup& setup) const {
    std::error_code error;
    if (!fs::exists(folder_, error) || fs::is_empty(folder_, error))
        return false;
    if (!fs::exists(folder_ / descriptionFile))
        throw std::runtime_error(folder_.string() + " is no training data set; choose another place with -o");
    if (replaces_) {
        requireOursOnly(folder_);
        return false;
    }
    const std::optional<Setup> earlier = Setup::read(folder_ / setupFile);
    const std::string difference =
        earlier ? setup.differenceFrom(*earlier) : std::string(setupFile) + " cannot be read";
    if (!difference.empty())
        throw std::runtime_error(folder_.string() + " holds another data set (" + difference +
                                 "); choose another place with -o, or replace it with --overwrite");
    removeLeftTools(folder_);
    return true;
}

Begun DatasetFolder::begun(const Setup& setup) const {
    requireOursOnly(part_);
    return fs::exists(part_ / supersededFile) ? Begun::no : begunWith(setup, part_, replaces_);
}

void DatasetFolder::discard() const {
    for (const char* file : ourFiles)
        if (file != storage::FolderLock::fileName && file != supersededFile)
            removeFile(part_ / file);
    removeTools(part_); // at last what says that the rest is nothing to go on from
}

void DatasetFolder::begin(const Setup& setup) const {
    discard();
    storage::writeWhole(part_ / setupFile, setup.json());
}

void DatasetFolder::requireSpace(std::uint64_t bytes) const {
    requireRoom(part_, bytes, "the data set");
}

void DatasetFolder::publish(storage::FolderLock& lock) const {
    storage::syncToDisk(part_);
    std::error_code none;
    if (fs::is_empty(folder_, none) || none) { // one that is empty is no data set
        storage::moveFolder(part_, folder_);
        lock.follow(folder_);
        return removeTools(folder_);
    }
    // it may have come, or may have got more in it, since the beginning
    if (!replaces_)
        throw std::runtime_error(folder_.string() + " was not there at the beginning; the data set is complete in " +
                                 part_.string());
    requireOursOnly(folder_);
    // both are locked, and what was there can be told from a begun export (decision 0129)
    storage::FolderLock old(folder_, anotherExport);
    storage::writeWhole(folder_ / supersededFile, "");
    storage::exchangeFolders(part_, folder_);
    lock.follow(folder_);
    old.follow(part_);
    removeTools(folder_);
    discard();
}

void DatasetFolder::requireOursOnly(const fs::path& folder) const {
    for (const fs::directory_entry& entry : fs::directory_iterator(folder))
        if (!belongsToMaking(entry.path().filename().native(), ourFiles))
            throw std::runtime_error(entry.path().string() + " is no part of a training data set, and " +
                                     folder.string() +
                                     " is not removed with it; move it, or choose another place with -o");
}

std::uintmax_t bytesOfDataset(const fs::path& folder) {
    std::uintmax_t bytes = 0;
    for (const char* file : {datasetFile::controls, datasetFile::deltas, datasetFile::frames, descriptionFile})
        bytes += fs::file_size(folder / file);
    std::error_code none; // a data set of an earlier version has no distances of the skin
    const std::uintmax_t skin = fs::file_size(folder / datasetFile::skin, none);
    return none ? bytes : bytes + skin;
}

} // namespace quarn
