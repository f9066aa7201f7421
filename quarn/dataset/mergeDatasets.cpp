// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/DatasetPart.h"
#include "quarn/dataset/mergedDescription.h"
#include "quarn/dataset/merging.h"
#include "quarn/dataset/partOrder.h"
#include "storage/ArrayFile.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* anotherMerge = "another quarn merge or export";

// the whole of parts that do not know it: from the first frame of all to the last, at their step
FrameRange unionOf(const std::vector<PlacedPart>& parts) {
    FrameRange whole = parts.front().record.frames;
    for (const PlacedPart& part : parts) {
        const FrameRange& frames = part.record.frames;
        if (whole.count() == 1 && frames.count() > 1)
            whole.step = frames.step;
        whole.first = std::min(whole.first, frames.first);
        whole.last = std::max(whole.last, frames.last);
    }
    return whole;
}

/// The parts, found to be a whole before anything is written.
class DatasetParts {
public:
    explicit DatasetParts(const MergeOptions& options)
        : console_(options.console) {
        for (const fs::path& folder : options.parts)
            place(folder.has_filename() ? folder : folder.parent_path()); // "folder/" is "folder"
        if (!haveRecords_)
            placeByFrames();
        orderParts(parts_);
        if (haveRecords_)
            requireOneBuild(parts_);
        description_.emplace(haveRecords_);
        for (const PlacedPart& part : parts_)
            compare(part.path);
        if (haveRecords_)
            requireSeams(parts_);
        if (haveRecords_ && !description_->agreesInFit())
            console_.note("the parts differ in how far the target is from the skin (targetFit), which is then said as "
                          "the first has it");
    }

    /// As one export of all frames has it.
    Setup setup() const {
        return setup_->without(setupEntry::part).with(setupEntry::frames, frameText(parts_.front().record.of));
    }
    const DatasetShape& shape() const { return shape_; }
    const MergedDescription& description() const { return *description_; }
    std::vector<fs::path> files(const char* name) const {
        std::vector<fs::path> paths;
        paths.reserve(parts_.size());
        for (const PlacedPart& part : parts_)
            paths.push_back(part.path / name);
        return paths;
    }
    std::set<std::string> instructionSets() const {
        std::set<std::string> sets;
        if (haveRecords_)
            for (const PlacedPart& part : parts_)
                sets.insert(part.record.instructionSet);
        return sets;
    }

private:
    void place(const fs::path& folder) {
        throwIfInterrupted();
        const DatasetPart part(folder);
        const bool hasRecord = part.record().has_value();
        if (!parts_.empty() && hasRecord != haveRecords_)
            throw std::runtime_error("of " + parts_.front().path.string() + " and " + folder.string() +
                                     " only one was exported with --of; parts of both kinds do not go together");
        haveRecords_ = hasRecord;
        PartRecord record = part.record().value_or(PartRecord());
        record.frames = part.frames();
        parts_.push_back({folder, std::move(record)});
    }

    void placeByFrames() {
        const FrameRange whole = unionOf(parts_);
        for (PlacedPart& part : parts_)
            part.record.of = whole;
        console_.note("the parts were exported without --of: what made them, and whether they fit where one ends and "
                      "the next begins, is not known. How far the target is from the skin (targetFit) is said of the "
                      "part where it is farthest");
    }

    // one part's texts at a time
    void compare(const fs::path& folder) {
        throwIfInterrupted();
        DatasetPart part(folder);
        part.check();
        const auto common = [&](const Setup& setup) {
            return haveRecords_ ? setup.without(setupEntry::part) : setup.without(setupEntry::frames);
        };
        if (!setup_)
            setup_ = part.setup();
        else if (const auto difference = common(part.setup()).firstDifference(common(*setup_)))
            refuseSetup(parts_.front().path, folder, *difference);
        shape_ = {shape_.rows + part.shape().rows, part.shape().controls, part.shape().deltas};
        description_->add(std::move(part));
    }

    const Console& console_;
    std::vector<PlacedPart> parts_;
    bool haveRecords_ = false;
    std::optional<Setup> setup_; ///< of the first
    std::optional<MergedDescription> description_;
    DatasetShape shape_;
};

void requireOther(const fs::path& output, const std::vector<fs::path>& parts) {
    std::error_code none;
    for (const fs::path& part : parts)
        if (fs::equivalent(output, part, none))
            throw std::runtime_error(output.string() + " is one of the parts; name another place with -o");
}

void writeArrays(const fs::path& folder, const DatasetParts& parts, const Console& console) {
    const DatasetShape& shape = parts.shape();
    Progress progress(console, "merging " + std::to_string(shape.rows) + " rows", shape.bytes());
    const auto join = [&](const char* name, const std::vector<std::uint64_t>& dimensions) {
        storage::joinArrays(folder / name, parts.files(name), dimensions,
                            [&](std::uint64_t bytes) { progress.advance(bytes); });
    };
    join(datasetFile::controls, {shape.rows, shape.controls});
    join(datasetFile::deltas, {shape.rows, shape.deltas, 3});
    join(datasetFile::frames, {shape.rows});
    join(datasetFile::skin, {shape.rows, shape.deltas});
}

void write(const DatasetFolder& folder, const DatasetParts& parts, const Console& console) {
    const Setup setup = parts.setup();
    if (folder.begun(setup) != Begun::no)
        console.note(folder.part().string() + " was begun before: beginning again, as all of it is in the parts");
    folder.discard(); // whose room is needed
    folder.requireSpace(parts.shape().bytes());
    folder.begin(setup);
    try {
        writeArrays(folder.part(), parts, console);
        const std::vector<ControlRange> ranges = controlRanges(folder.part() / datasetFile::controls, parts.shape());
        storage::writeWhole(folder.part() / descriptionFile, parts.description().text(parts.shape().rows, ranges));
    } catch (...) {
        folder.discard(); // a copy of what is there
        throw;
    }
}

} // namespace

MergeAnswer mergeDatasets(const MergeOptions& options) {
    Stage stage([&] { return "merging " + std::to_string(options.parts.size()) + " data sets"; });
    requireOther(options.output, options.parts);
    const DatasetParts parts(options);
    const DatasetFolder folder(fs::absolute(options.output), options.overwrite);
    const auto answer = [&](bool wasComplete) {
        if (wasComplete)
            options.console.note(folder.path().string() + " is complete: there is nothing to do");
        return MergeAnswer{folder.path(), parts.shape().rows, bytesOfDataset(folder.path()), wasComplete,
                           parts.instructionSets()};
    };
    if (folder.isDone(parts.setup()))
        return answer(true);
    storage::FolderLock lock(folder.part(), anotherMerge);
    if (folder.isDone(parts.setup())) // by now, by another process
        return answer(true);
    write(folder, parts, options.console);
    folder.publish(lock);
    stage.result([&] { return std::to_string(parts.shape().rows) + " rows"; });
    return answer(false);
}

} // namespace quarn
