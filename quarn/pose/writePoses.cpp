// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/writePoses.h"

#include "quarn/console/Log.h"
#include "quarn/console/UsageError.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/numberText.h"
#include "quarn/pose/Motion.h"
#include "quarn/pose/animationPoses.h"
#include "quarn/pose/bvhPoses.h"
#include "quarn/pose/gltfPoses.h"
#include "quarn/pose/poseKeys.h"
#include "quarn/pose/textPoses.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/units.h"
#include "storage/WholeFile.h"

#include <algorithm>
#include <cctype>
#include <stdexcept>
#include <system_error>

namespace quarn {
namespace {

std::string lowerEnding(const std::filesystem::path& path) {
    std::string ending = path.extension().string();
    std::transform(ending.begin(), ending.end(), ending.begin(),
                   [](unsigned char letter) { return static_cast<char>(std::tolower(letter)); });
    return ending;
}

bool countsSeconds(const std::string& ending) {
    return ending == ".glb";
}

FilePlaces placesOf(const PosesFileOptions& options) {
    FilePlaces places;
    places.offset = options.frameOffset;
    places.perSecond = framesPerSecond().value_or(places.perSecond);
    return places;
}

std::string placeText(const FilePlaces& places, int frame, const std::string& ending) {
    if (ending == ".bvh")
        return "its first line of motion";
    if (!countsSeconds(ending))
        return "frame " + std::to_string(places.frame(frame));
    return "second " + numberText(places.seconds(frame)) + ", at " + numberText(places.perSecond) + " frames a second";
}

// `weights`: those that are in the file all the same
void noteWhatHasNoJoint(const Motion& motion, const std::vector<HPlug>& weights, const Console& console) {
    const auto isHeld = [&](const PlugTrack& track) {
        return nodeType(track.plug.node()) == "joint" ||
               std::find(weights.begin(), weights.end(), track.plug) != weights.end();
    };
    const auto other = std::find_if_not(motion.tracks.begin(), motion.tracks.end(), isHeld);
    if (other == motion.tracks.end())
        return;
    const auto count = std::count_if(other, motion.tracks.end(), [&](const auto& track) { return !isHeld(track); });
    console.note(std::to_string(count) + (count == 1 ? " plug that moves is" : " plugs that move are") +
                 " of no joint and not in the file, " + other->name + " first: .json and .csv hold all");
}

void noteLockedPlugs(const Motion& motion, const Console& console) {
    for (const PlugTrack& track : motion.tracks)
        if (!track.isKeyable)
            console.note(track.name + " " + whyNotKeyable(track.plug) + " and is not in the file");
}

void writeTo(std::ostream& out, const std::string& ending, const Motion& motion, const FilePlaces& places,
             PosesFileReport& report, const Console& console) {
    if (ending == ".csv")
        return writeTable(out, motion, places);
    if (ending == ".json") {
        writeKeys(out, motion, places);
        return noteLockedPlugs(motion, console);
    }
    if (ending == ".bvh") {
        writeBvhPoses(out, motion, places);
        console.note(
            "a .bvh holds no mesh, no numbers of frames and no rotations of the rest pose: its skeleton stands "
            "with all joints unturned, and only the motion is the scene's");
        return noteWhatHasNoJoint(motion, {}, console);
    }
    const GltfPosesAnswer answer = writeGltfPoses(out, motion, places);
    report.meshes = answer.meshes;
    for (const std::string& note : answer.notes)
        console.note(note);
    noteWhatHasNoJoint(motion, answer.weights, console);
}

} // namespace

void requirePosesFile(const PosesFileOptions& options, const std::vector<std::filesystem::path>& scenes) {
    const std::string ending = lowerEnding(options.file);
    if (ending != ".glb" && ending != ".json" && ending != ".csv" && ending != ".bvh")
        throw UsageError("--write " + options.file.string() + ": poses are written as .glb, .json, .csv or .bvh");
    if (ending == ".bvh" && options.frameOffset != 0)
        throw UsageError("--frame-offset: frames have no numbers in " + options.file.string());
    for (const std::filesystem::path& scene : scenes) {
        std::error_code none;
        if (!scene.empty() && (scene.lexically_normal() == options.file.lexically_normal() ||
                               std::filesystem::equivalent(scene, options.file, none)))
            throw UsageError("--write " + options.file.string() + " would replace the scene: name another file");
    }
    storage::WholeFile::requirePossible(options.file);
}

void requirePlace(const PosesFileOptions& options, int firstFrame) {
    const FilePlaces places = placesOf(options);
    if (countsSeconds(lowerEnding(options.file)) && places.seconds(firstFrame) < 0.0)
        throw std::runtime_error(options.file.string() + ": frame " + std::to_string(firstFrame) +
                                 " would lie at second " + numberText(places.seconds(firstFrame)) +
                                 ", and glTF begins with second 0: --frame-offset " + std::to_string(1 - firstFrame) +
                                 " puts it there");
}

FrameRange framesOfScene(const std::optional<Warp>& warp) {
    constexpr int nobodysFirst = 1;
    constexpr int nobodysLast = 1000;
    if (!warp)
        return extentOf(drivingCurves());
    const int first = wholeNumberOf(warp->plug("exportStartFrame"));
    const int last = wholeNumberOf(warp->plug("exportEndFrame"));
    const bool isSet = first != nobodysFirst || last != nobodysLast;
    return isSet && first <= last ? FrameRange{first, last, 1} : extentOf(drivingCurves());
}

PosesFileReport writePoses(const PosesFileOptions& options, const std::optional<Warp>& warp, const FrameRange& frames,
                           const Console& console) {
    Stage stage([&] { return "writing poses to " + options.file.string(); });
    requirePlace(options, frames.first);
    const Motion motion = readMotion(warp, frames, console);
    const std::string ending = lowerEnding(options.file);
    const FilePlaces places = placesOf(options);
    PosesFileReport report{options.file,
                           frames.count(),
                           motion.joints.size(),
                           motion.tracks.size(),
                           0,
                           frames.first,
                           placeText(places, frames.first, ending)};
    storage::WholeFile file(options.file);
    try {
        writeTo(file.stream(), ending, motion, places, report, console);
    } catch (const Interrupted&) {
        throw;
    } catch (const std::runtime_error& error) {
        throw std::runtime_error(options.file.string() + " could not be written: " + error.what());
    }
    file.finish();
    stage.result([&] { return std::to_string(report.frames) + " frames"; });
    return report;
}

} // namespace quarn
