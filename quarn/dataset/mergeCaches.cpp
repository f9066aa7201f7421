// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/dataset/merging.h"
#include "quarn/dataset/partOrder.h"
#include "quarn/dataset/roomOnDisk.h"
#include "storage/ArrayFile.h"
#include "storage/FileError.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <optional>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr const char* anotherMerge = "another quarn merge or bake";

/// What all frames of a cache are alike in.
struct CacheShape {
    std::string type;
    std::uint64_t vertices = 0, rowBytes = 0;

    std::string text() const { return std::to_string(vertices) + " vertices in '" + type + "'"; }
    bool operator==(const CacheShape& other) const { return type == other.type && vertices == other.vertices; }
};

struct CachePart {
    fs::path path;
    std::optional<PartRecord> record;
    CacheShape shape;
    std::uint64_t frames = 0;
    std::string firstSum; ///< empty without frames
};

void requireComplete(const fs::path& path) {
    std::error_code none;
    const fs::path begun = path.string() + ".part";
    if (!fs::exists(path, none) && fs::exists(begun, none))
        throw std::runtime_error(path.string() + " is not complete: there is " + begun.string() +
                                 ", and the bake that made it goes on from there");
}

CachePart readPart(const fs::path& path) {
    throwIfInterrupted();
    requireComplete(path);
    const storage::ArrayFile file(path);
    const std::vector<std::uint64_t>& shape = file.array().shape;
    if (shape.size() < 2 || shape.size() > 3 || shape.back() != 3 || file.array().descr == "<i4")
        throw storage::FileError(path, "is no point cache: it has numbers '" + file.array().descr + "' in the shape " +
                                           storage::npyShapeText(shape));
    const bool isSingle = shape.size() == 2; // a frame without an axis for it
    CachePart part{path, PartRecord::read(PartRecord::besideCache(path)), {}, 0, ""};
    part.shape = {file.array().descr, shape[shape.size() - 2], isSingle ? file.numbers().size : file.rowBytes()};
    part.frames = isSingle ? 1 : file.rows();
    if (part.frames > 0) {
        std::vector<std::byte> row(part.shape.rowBytes);
        file.read(0, row);
        part.firstSum = rowSum({row});
    }
    return part;
}

void requireItsRecord(const CachePart& part) {
    const FrameRange& frames = part.record->frames;
    if (part.frames != frames.count())
        throw storage::FileError(part.path, "is damaged: it has " + std::to_string(part.frames) +
                                                " frames, and its record speaks of " + frameText(frames));
    // other programs that make parts may sum rows their own way, and their seams are held against each other all the
    // same
    const bool isOurs = part.record->firstSum.starts_with(rowSumKind);
    if (isOurs && part.firstSum != part.record->firstSum)
        throw storage::FileError(part.path, "is damaged: its first frame is not the one that its record speaks of");
}

void requireOneSetup(const CachePart& first, const CachePart& part) {
    if (first.record->setupSum == part.record->setupSum)
        return;
    const auto common = [](const CachePart& of) {
        return of.record->setup.value_or(Setup()).without(setupEntry::part);
    };
    const auto difference = common(part).firstDifference(common(first));
    refuseSetup(
        first.path, part.path,
        difference.value_or(Setup::Difference{"the sum of the set-up", first.record->setupSum, part.record->setupSum}));
}

/// The parts, found to be a whole before anything is written.
class CacheParts {
public:
    explicit CacheParts(const MergeOptions& options) {
        for (const fs::path& path : options.parts)
            add(readPart(path));
        if (parts_.front().record)
            orderByRecords();
        else
            options.console.note("the parts have no records, as quarn bake --of makes them: they are joined in the "
                                 "order in which they were given, and whether they fit where one ends and the next "
                                 "begins is not known");
    }

    const CacheShape& shape() const { return parts_.front().shape; }
    std::uint64_t frames() const { return frames_; }
    std::uint64_t bytes() const { return storage::npyHeadSize + frames_ * shape().rowBytes; }
    const std::vector<CachePart>& parts() const { return parts_; }
    std::set<std::string> instructionSets() const {
        std::set<std::string> sets;
        for (const CachePart& part : parts_)
            if (part.record)
                sets.insert(part.record->instructionSet);
        return sets;
    }

private:
    void add(CachePart part) {
        const CachePart& first = parts_.empty() ? part : parts_.front();
        if (!(part.shape == first.shape))
            throw std::runtime_error(first.path.string() + " has " + first.shape.text() + ", and " +
                                     part.path.string() + " " + part.shape.text());
        if (part.record.has_value() != first.record.has_value())
            throw std::runtime_error("of " + first.path.string() + " and " + part.path.string() +
                                     " only one has a record beside it, as quarn bake --of makes it; parts of both "
                                     "kinds do not go together");
        if (part.record) {
            requireItsRecord(part);
            requireOneSetup(first, part);
        }
        frames_ += part.frames;
        parts_.push_back(std::move(part));
    }

    void orderByRecords() {
        std::vector<PlacedPart> placed;
        for (const CachePart& part : parts_)
            placed.push_back({part.path, *part.record});
        orderParts(placed);
        requireOneBuild(placed);
        requireSeams(placed);
        std::stable_sort(parts_.begin(), parts_.end(), [](const CachePart& a, const CachePart& b) {
            return a.record->frames.first < b.record->frames.first;
        });
    }

    std::vector<CachePart> parts_;
    std::uint64_t frames_ = 0;
};

// frame by frame
bool hasFramesOf(const storage::ArrayFile& whole, const CacheParts& parts, Progress& progress) {
    std::vector<std::byte> there(parts.shape().rowBytes), frame(there.size());
    std::uint64_t at = 0;
    for (const CachePart& part : parts.parts()) {
        const storage::ArrayFile file(part.path);
        for (std::uint64_t row = 0; row < part.frames; ++row, ++at) {
            whole.read(at, there);
            file.read(row, frame);
            if (there != frame)
                return false;
            progress.advance(frame.size());
        }
    }
    return true;
}

/// Whether the output is what the parts come to. Throws when it is something else, which is to stay.
bool isDone(const MergeOptions& options, const CacheParts& parts) {
    std::error_code none;
    if (options.overwrite || !fs::exists(options.output, none))
        return false;
    const storage::NpyArray meant{parts.shape().type, {parts.frames(), parts.shape().vertices, 3}};
    try {
        const storage::ArrayFile whole(options.output);
        Progress progress(options.console, "comparing with " + options.output.filename().string(), parts.bytes());
        if (whole.array().descr == meant.descr && whole.array().shape == meant.shape &&
            hasFramesOf(whole, parts, progress))
            return true;
    } catch (const storage::FileError& why) {
        log([&] { return std::string(why.what()); });
    }
    throw std::runtime_error(options.output.string() +
                             " is there, and is not what the parts come to; choose another place with -o, or replace "
                             "it with --overwrite");
}

void write(const MergeOptions& options, const CacheParts& parts) {
    storage::WholeFile file(options.output, storage::WholeFile::Writes::anywhere);
    requireRoom(file.temporary().parent_path(), parts.bytes(), "the cache");
    Progress progress(options.console, "merging " + std::to_string(parts.frames()) + " frames", parts.bytes());
    std::vector<fs::path> paths;
    for (const CachePart& part : parts.parts())
        paths.push_back(part.path);
    storage::joinArrays(file.temporary(), paths, {parts.frames(), parts.shape().vertices, 3},
                        [&](std::uint64_t bytes) { progress.advance(bytes); });
    file.finish();
}

void requireOther(const MergeOptions& options) {
    if (options.output.extension() != ".npy")
        throw std::runtime_error(options.output.string() + " is no .npy file, as the parts are");
    std::error_code none;
    for (const fs::path& part : options.parts)
        if (fs::equivalent(options.output, part, none))
            throw std::runtime_error(options.output.string() + " is one of the parts; name another place with -o");
}

void noteBegun(const MergeOptions& options) {
    const fs::path begun = options.output.string() + ".part";
    const auto isOther = [](const auto& entry) { return entry.path().filename() != storage::FolderLock::fileName; };
    if (std::any_of(fs::directory_iterator(begun), {}, isOther))
        options.console.note(begun.string() + ", which a bake has begun, stays; remove it if it is not to go on");
}

} // namespace

MergeAnswer mergeCaches(const MergeOptions& options) {
    Stage stage([&] { return "merging " + std::to_string(options.parts.size()) + " point caches"; });
    requireOther(options);
    const CacheParts parts(options);
    const storage::FolderLock lock(options.output.string() + ".part", anotherMerge); // where a bake has it, too
    const bool wasComplete = isDone(options, parts);
    if (wasComplete)
        options.console.note(options.output.string() + " is complete: there is nothing to do");
    else
        write(options, parts);
    noteBegun(options);
    stage.result([&] { return std::to_string(parts.frames()) + " frames"; });
    return {fs::absolute(options.output), parts.frames(), parts.bytes(), wasComplete, parts.instructionSets()};
}

} // namespace quarn
