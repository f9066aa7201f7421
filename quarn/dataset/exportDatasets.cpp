// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/exportDatasets.h"

#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/dataset/DatasetFolder.h"
#include "quarn/dataset/description.h"
#include "quarn/dataset/drawnFrames.h"
#include "quarn/dataset/exportFrames.h"
#include "quarn/dataset/rowSums.h"
#include "quarn/dataset/sceneSetup.h"
#include "quarn/dataset/settledKind.h"
#include "quarn/scene/PartRecord.h"
#include "quarn/scene/meshSum.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/targetCheck.h"
#include "quarn/scene/units.h"
#include "storage/FolderLock.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <map>
#include <stdexcept>

namespace quarn {
namespace {

namespace fs = std::filesystem;

// all that have a target; one alone is said to lack it by who reads it
std::vector<WarpGeometry> chosenGeometries(const Warp& warp, const ExportOptions& options) {
    if (!options.geometry.empty() || warp.geometries.size() < 2)
        return {warp.geometry(options.geometry)};
    std::vector<WarpGeometry> chosen;
    std::string others;
    for (const WarpGeometry& geometry : warp.geometries)
        if (geometry.target.isNull())
            others += (others.empty() ? "" : ", ") + geometry.name;
        else
            chosen.push_back(geometry);
    if (chosen.empty())
        throw std::runtime_error("none of the geometries of " + warp.name + " has a target (" + others +
                                 "); quarn target SCENE --cache FILE.npy --geometry NAME connects one");
    if (!others.empty())
        options.console.note("without target, and not exported: " + others);
    return chosen;
}

fs::path folderByScene(const Warp& warp, const WarpGeometry& geometry) {
    const std::string root = textOf(warp.plug("trainingDataRoot"));
    const std::string name = textOf(warp.plug("export", geometry, "trainingDataName"));
    if (root.empty())
        throw std::runtime_error(warp.name + ".trainingDataRoot is empty; set it, or say with -o where to export to");
    const fs::path folder = fs::path(root) / (name.empty() ? geometry.name : name);
    // a scene may come from anywhere, and is not to choose a place above its own that looks like one below
    if (std::find(folder.begin(), folder.end(), "..") != folder.end() || fs::path(name).is_absolute())
        throw std::runtime_error("the scene would have " + geometry.name + " exported to " + folder.string() + " (" +
                                 warp.name + ".trainingDataRoot and export[" + std::to_string(geometry.index) +
                                 "].trainingDataName); say with -o where to export to");
    return fs::current_path() / folder;
}

// one folder each: two geometries that are to go into the same are refused
std::vector<fs::path> foldersOf(const Warp& warp, const std::vector<WarpGeometry>& geometries,
                                const ExportOptions& options) {
    std::map<fs::path, std::string> taken;
    std::vector<fs::path> folders;
    folders.reserve(geometries.size());
    for (const WarpGeometry& geometry : geometries) {
        const fs::path output = absolutePath(options.output);
        // where one of several is left out, the others' places stay
        const bool isOnly = !options.geometry.empty() || warp.geometries.size() == 1;
        fs::path folder = output.empty() ? folderByScene(warp, geometry) : isOnly ? output : output / geometry.name;
        folder = folder.lexically_normal();
        const std::string label = geometry.name + " (" + std::to_string(geometry.index) + ")";
        if (const auto [other, isNew] = taken.emplace(folder, label); !isNew)
            throw std::runtime_error(other->second + " and " + label + " would both be exported to " + folder.string() +
                                     "; choose one with --geometry, and a folder with -o");
        folders.push_back(folder);
    }
    return folders;
}

/// Rows that are equal to the one before.
struct Repeats {
    std::size_t count = 0;
    int firstFrame = 0;

    void look(int frame, const std::vector<float>& controls, const std::vector<float>& deltas) {
        if (controls == controls_ && deltas == deltas_ && count++ == 0)
            firstFrame = frame;
        controls_ = controls;
        deltas_ = deltas;
    }

private:
    std::vector<float> controls_, deltas_; ///< of the row before
};

/// The export of one geometry.
class GeometryExport {
public:
    GeometryExport(SceneSession& session, const Warp& warp, const WarpGeometry& geometry, const fs::path& folder,
                   const ExportOptions& options)
        : session_(session)
        , options_(options)
        , warp_(warp)
        , geometry_(geometry)
        , part_(partFrames(exportFrames(warp, options.frames), options.part))
        , frames_(part_.frames)
        , whole_(part_.whole)
        , sceneFile_(absolutePath(options.scene.scene))
        , folder_(folder, options.overwrite)
        , sampler_(session.host(), warp, geometry, whole_.first)
        , setup_(setupNow()) {
        facts_.scene = sceneFile_.filename().string();
        facts_.diagonal = diagonalOf(geometry.original);
        facts_.restSum = meshSum(geometry.original);
        facts_.drawn = drawnFrames(whole_);
        facts_.shape = {frames_.count(), sampler_.names().size(), sampler_.map().affectCount()};
    }

    ExportAnswer run() {
        Stage stage([&] { return "exporting " + geometry_.name + " to " + folder_.path().string(); });
        stage.result([&] { return std::to_string(facts_.shape.rows) + " rows"; });
        if (folder_.isDone(setup_))
            return alreadyDone();
        storage::FolderLock lock(folder_.part(), anotherExport);
        if (folder_.isDone(setup_)) // by now, by another process
            return alreadyDone();
        compare();
        if (options_.like.empty() && options_.smoothing.empty())
            warnOfJumps(session_.host(), warp_, geometry_, sampler_, whole_, options_.console);
        const std::size_t before = write();
        folder_.publish(lock);
        warnOfRepeats();
        return answer(before);
    }

private:
    Setup setupNow() const { return sceneSetup(sceneFile_, warp_, geometry_, sampler_, part_); }

    ExportAnswer alreadyDone() {
        options_.console.note(folder_.path().string() + " is complete: there is nothing to do");
        return answer(facts_.shape.rows);
    }

    ExportAnswer answer(std::size_t before) const {
        const DatasetShape& shape = facts_.shape;
        return {geometry_.name,  folder_.path(), shape.rows,     before,       facts_.fit,
                metersPerUnit(), repeats_.count, shape.controls, shape.deltas, bytesOfDataset(folder_.path())};
    }

    // while a mistake costs seconds, and not a training
    void compare() {
        const HIndexMapper& map = sampler_.map();
        TargetFrames frames;
        frames.count = whole_.count();
        frames.last = frames.count - 1;
        frames.reach = 3; // each is an evaluation of whatever makes the target
        frames.time = [this](std::size_t frame) { return whole_.frame(frame); };
        frames.read = [this](std::size_t frame, std::vector<double>& xyz) {
            session_.host().setTime(whole_.frame(frame));
            readPoints(geometry_.target, xyz);
        };
        if (!map.isIdentityMap())
            for (const unsigned vertex : map.affectMap())
                frames.vertices.push_back(vertex);
        if (map.affectCount() > 0)
            facts_.fit = compareWithSkin(session_.host(), geometry_, geometry_.original, frames, options_.console);
        if (!facts_.fit)
            return;
        FitContext context;
        context.what = "the target of " + geometry_.name;
        context.metersPerUnit = metersPerUnit();
        tell(verdictOf(*facts_.fit, context, false), options_.anyway, options_.console);
    }

    // answers how many rows there were
    std::size_t write() {
        DatasetWriter writer(folder_.part(), facts_.shape);
        const bool resumes = goOn(writer, folder_.begun(setup_), folder_.part(), options_.console);
        folder_.requireSpace(facts_.shape.bytes() - writer.rows() * facts_.shape.rowBytes());
        if (!resumes) {
            folder_.begin(setup_);
            writer.begin();
        }
        const std::size_t before = writer.rows();
        try {
            writeRows(writer);
        } catch (...) {
            if (!keepRows(writer, folder_.part(), options_.console))
                discard();
            throw;
        }
        writer.save();
        if (part_.isPart)
            storage::writeWhole(folder_.part() / PartRecord::fileName, record(before).json());
        requireUnchanged();
        session_.host().setTime(whole_.first); // whatever frame it ended with
        storage::writeWhole(
            folder_.part() / descriptionFile,
            datasetDescription(facts_, warp_, geometry_, sampler_, folder_.part() / datasetFile::controls));
        return before;
    }

    void writeRows(DatasetWriter& writer) {
        Progress progress(options_.console, "exporting " + geometry_.name, facts_.shape.rows);
        progress.advance(writer.rows());
        if (writer.rows() < facts_.shape.rows)
            evaluateBefore(frames_.frame(writer.rows()));
        while (writer.rows() < facts_.shape.rows) {
            const int frame = frames_.frame(writer.rows());
            sampler_.sample(frame);
            repeats_.look(frame, sampler_.controls(), sampler_.deltas());
            writer.append(frame, sampler_.controls(), sampler_.deltas(), sampler_.skin());
            progress.advance();
        }
    }

    // for what remembers the frames before
    void evaluateBefore(int frame) {
        for (const int earlier : part_.before(frame)) {
            throwIfInterrupted();
            sampler_.sample(earlier);
        }
    }

    // the frame after the last is evaluated as the next part does it, if that part begins as if there were none
    PartRecord record(std::size_t rowsBefore) {
        PartRecord record = PartRecord::made(part_, setup_);
        record.firstSum = firstRowSum(folder_.part(), facts_.shape);
        if (const std::optional<int> next = part_.next()) {
            if (rowsBefore == facts_.shape.rows) // and none of this was evaluated now
                evaluateBefore(*next);
            sampler_.sample(*next);
            record.nextSum = rowSum(*next, sampler_.controls(), sampler_.deltas(), sampler_.skin());
        }
        return record;
    }

    void warnOfRepeats() const {
        if (repeats_.count > 0)
            options_.console.warn(std::to_string(repeats_.count) + " of " + std::to_string(facts_.shape.rows) +
                                  " rows of " + geometry_.name + " are equal to the row before, the first in frame " +
                                  std::to_string(repeats_.firstFrame) + ": nothing moves there, and training on them " +
                                  "teaches nothing. --frames, or exportStartFrame and exportEndFrame of " + warp_.name +
                                  ", leave them out");
    }

    void discard() const {
        try {
            folder_.discard();
        } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): what ended the rows is what the user reads
        }
    }

    // a cache that is written while it is read gives rows that do not go together
    void requireUnchanged() const {
        if (const std::string difference = setupNow().differenceFrom(setup_); !difference.empty())
            throw std::runtime_error("what is exported has changed meanwhile (" + difference +
                                     "); export again with --overwrite");
    }

    SceneSession& session_;
    const ExportOptions& options_;
    const Warp& warp_;
    const WarpGeometry& geometry_;
    PartFrames part_;
    FrameRange frames_, whole_; ///< of the part, and all
    fs::path sceneFile_;
    DatasetFolder folder_;
    FrameSampler sampler_;
    Setup setup_;
    DatasetFacts facts_;
    Repeats repeats_;
};

} // namespace

std::vector<ExportAnswer> exportDatasets(const ExportOptions& options) {
    SceneSession session(options.scene);
    const Warp warp = Warp::find(options.deformer);
    const std::vector<WarpGeometry> geometries = chosenGeometries(warp, options);
    const std::vector<fs::path> folders = foldersOf(warp, geometries, options);
    const FrameRange whole = partFrames(exportFrames(warp, options.frames), options.part).whole;
    std::vector<ExportAnswer> answers;
    answers.reserve(geometries.size());
    if (options.output.empty())
        for (std::size_t i = 0; i < geometries.size(); ++i)
            options.console.note("exporting " + geometries[i].name + " to " + folders[i].string() +
                                 ", as the scene says");
    for (std::size_t i = 0; i < geometries.size(); ++i) {
        std::optional<KindChoice> choice = settleKind(session.host(), warp, geometries[i], whole, options);
        answers.push_back(GeometryExport(session, warp, geometries[i], folders[i], options).run());
        answers.back().choice = std::move(choice);
    }
    return answers;
}

} // namespace quarn
