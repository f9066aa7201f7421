// SPDX-License-Identifier: Apache-2.0
#include "quarn/dataset/settledKind.h"

#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/dataset/DatasetFolder.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/units.h"
#include "storage/FileError.h"
#include "storage/Json.h"

namespace quarn {
namespace {

namespace fs = std::filesystem;

constexpr int mostPasses = 100; // of export.smoothingIterations

quill::IndexMapper quillMap(const HIndexMapper& mapper) {
    quill::IndexMapper map;
    if (mapper.isIdentityMap())
        map.setIdentity(mapper.fullCount());
    else
        map.set({mapper.affectMap().begin(), mapper.affectMap().end()}, mapper.fullCount());
    return map;
}

void setKind(const Warp& warp, const WarpGeometry& geometry, const DeltaKind& kind) {
    setNumber(warp.plug("export", geometry, "deltaMode"), kind.mode);
    setNumber(warp.plug("export", geometry, "smoothingIterations"), kind.smoothingIterations);
}

int wholeNumber(const fs::path& file, const storage::JsonDocument& json, const char* key, int largest) {
    if (!json.IsObject() || !json.HasMember(key) || !json[key].IsInt() || json[key].GetInt() < 0 ||
        json[key].GetInt() > largest)
        throw storage::FileError(file, std::string("has no \"") + key + "\" from 0 to " + std::to_string(largest));
    return json[key].GetInt();
}

DeltaKind kindOfDataset(const fs::path& folder) {
    const fs::path file = absolutePath(folder) / descriptionFile;
    const storage::JsonDocument json = storage::readJson(file.string(), storage::jsonRules::dataset);
    return {wholeNumber(file, json, "deltaMode", 1), wholeNumber(file, json, "smoothingIterations", mostPasses)};
}

} // namespace

std::optional<KindChoice> settleKind(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry,
                                     const FrameRange& frames, const ExportOptions& options) {
    if (!options.like.empty())
        setKind(warp, geometry, kindOfDataset(options.like));
    if (options.smoothing.empty())
        return {};
    if (frames.count() < leastStudied) {
        options.console.note("kinds of deltas are compared on " + std::to_string(leastStudied) +
                             " frames or more, and there are " + std::to_string(frames.count()) + ": " + geometry.name +
                             " gets the kind that the scene says");
        return {};
    }
    const quill::IndexMapper map = quillMap(FrameSampler(host, warp, geometry, frames.first).map());
    if (map.affectCount() == 0)
        return {};
    KindChoice choice;
    choice.study = studySmoothing(host, warp, geometry, map, frames, comparedKinds(), options.console);
    choice.chosen = chosenKind(choice.study);
    setKind(warp, geometry, choice.study.kinds[choice.chosen].kind);
    return choice;
}

void warnOfJumps(OpenQuarn::Session& host, const Warp& warp, const WarpGeometry& geometry, const FrameSampler& sampler,
                 const FrameRange& frames, const Console& console) {
    if (!sampler.kind().isSurface() || frames.count() < leastStudied || sampler.map().affectCount() == 0)
        return;
    try {
        const SmoothingStudy study =
            studySmoothing(host, warp, geometry, quillMap(sampler.map()), frames, {sampler.kind(), {0, 0}}, console);
        const std::string warning = jumpWarning(study, geometry.name, diagonalOf(geometry.original), metersPerUnit());
        if (!warning.empty())
            console.warn(warning);
    } catch (const Interrupted&) {
        throw;
    } catch (const std::runtime_error& error) { // such a frame ends the export, when its rows come to it
        log([&] { return std::string("deltas were not compared: ") + error.what(); });
    }
}

} // namespace quarn
