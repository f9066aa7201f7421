// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/importCharacter.h"

#include "openquarn_app/SceneFile.h"
#include "quarn/character/readCharacter.h"
#include "quarn/character/rootsWarning.h"
#include "quarn/console/Log.h"
#include "quarn/import/animationCurves.h"
#include "quarn/import/clips.h"
#include "quarn/import/jsonFiles.h"
#include "quarn/import/posedJoints.h"
#include "quarn/import/reparent.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/vertexMap.h"
#include "storage/Json.h"
#include "storage/WholeFile.h"
#include "storage/npyArray.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

namespace quarn {
namespace {

namespace fs = std::filesystem;

void append(std::vector<std::string>& texts, std::vector<std::string>&& more) {
    texts.insert(texts.end(), std::make_move_iterator(more.begin()), std::make_move_iterator(more.end()));
}

const Animation* animationNamed(const Character& character, const std::string& name, const std::string& file) {
    std::string names;
    for (const Animation& animation : character.animations) {
        if (animation.name == name)
            return &animation;
        names += (names.empty() ? "; it has " : ", ") + animation.name;
    }
    throw std::runtime_error(file + " has no animation \"" + name + "\"" + names);
}

std::vector<const Animation*> chosenAnimations(const Character& character, const ImportOptions& options) {
    std::vector<const Animation*> chosen;
    const bool all = options.animations == std::vector<std::string>{"all"};
    for (const Animation& animation : character.animations)
        if (all || (options.animations.empty() && chosen.empty()))
            chosen.push_back(&animation);
    if (all || options.animations.empty())
        return chosen;
    for (const std::string& name : options.animations) {
        const Animation* animation = animationNamed(character, name, options.file.string());
        if (std::find(chosen.begin(), chosen.end(), animation) != chosen.end())
            throw std::runtime_error("--animation " + name + " is given twice");
        chosen.push_back(animation);
    }
    return chosen;
}

std::vector<const Animation*> allAnimations(const Character& character) {
    std::vector<const Animation*> animations;
    for (const Animation& animation : character.animations)
        animations.push_back(&animation);
    return animations;
}

// where vertex maps go. `{mesh}` in the name of the scene's attribute stands for the mesh, where there are several
fs::path mapFile(const fs::path& scene, const std::string& mesh, std::size_t meshCount) {
    const std::string middle = meshCount > 1 ? "." + mesh : "";
    return scene.parent_path() / (scene.stem().string() + middle + ".vertices.npy");
}

void checkOutput(const ImportOptions& options) {
    std::error_code none;
    if (fs::equivalent(options.file, options.output, none))
        throw std::runtime_error(options.output.string() + " is the character itself; name another file for the scene");
    if (fs::is_directory(options.output))
        throw std::runtime_error(options.output.string() + " is a folder; name a file for the scene");
    storage::WholeFile::requirePossible(options.output, storage::WholeFile::Writes::anywhere); // with files beside it
    if (!options.writtenLimits.empty())
        storage::WholeFile::requirePossible(options.writtenLimits);
}

// somebody may have edited what an earlier import wrote
void requireUnedited(const fs::path& limits, const std::string& text) {
    std::error_code none;
    if (fs::exists(limits, none) && storage::readWholeFile(limits, storage::jsonRules::joints.mostBytes) != text)
        throw std::runtime_error(limits.string() + " is there already with other limits, which somebody may have " +
                                 "edited: give it to --limits, name another file for --write-limits, or remove it");
}

class Import {
public:
    explicit Import(const ImportOptions& options)
        : options_(options) {}

    ImportReport run() {
        readInput();
        const Animation* animation = layAnimations();
        const std::vector<JointRest> rests = splitRests(character_, animation);
        const PosedJoints posed = options_.neuralWarp ? choose(rests, animation) : PosedJoints();

        SceneSession session(options_.plugins);
        const WarpNodes nodes = options_.neuralWarp ? makeWarpNodes(options_.warp, !posed.joints.empty()) : WarpNodes();
        CharacterScene scene = buildScene(character_, rests);
        append(report_.warnings, std::move(scene.notes));
        if (animation != nullptr && !options_.noAnimation)
            report_.curves = addAnimation(character_, *animation, rests, options_.framesPerSecond, scene);
        const PosedSliders sliders = hasMorphControls() ? chooseSliders(scene, animation) : PosedSliders();
        if (options_.neuralWarp) {
            requireControls(posed, sliders);
            connectWarp(nodes, settings(animation), posed.joints, sliders, scene);
        }
        tellWhatThereIs(scene, posed, sliders);
        writeLimits(posed, sliders);
        writeFiles(session, scene);
        return std::move(report_);
    }

private:
    void readInput() {
        Stage stage([&] { return "reading character " + options_.file.string(); });
        character_ = readCharacter(options_.file.string());
        stage.result([&] {
            return std::to_string(character_.meshes.size()) + " meshes, " + std::to_string(character_.joints.size()) +
                   " joints, " + std::to_string(character_.animations.size()) + " animations";
        });
        if (!options_.parents.empty())
            changeParents();
        report_.warnings = std::exchange(character_.warnings, {});
        if (options_.metersPerUnit)
            character_.metersPerUnit = *options_.metersPerUnit;
        if (!options_.limits.empty())
            limits_ = readLimits(options_.limits);
        if (options_.neuralWarp)
            requireMover();
    }

    const Animation* layAnimations() {
        const std::vector<const Animation*> chosen = chosenAnimations(character_, options_);
        if (chosen.empty())
            return nullptr;
        clips_ = layClips(character_, chosen, options_.framesPerSecond);
        return &clips_.animation;
    }

    bool hasMorphControls() const { return options_.neuralWarp && options_.morphControls; }

    // a file of plain meshes, say: what it has, and what is missing
    void requireMover() const {
        std::string meshes;
        for (const CharacterMesh& mesh : character_.meshes) {
            if (!mesh.bindings.empty() || mesh.parentJoint >= 0 || (hasMorphControls() && !mesh.morphTargets.empty()))
                return;
            meshes +=
                (meshes.empty() ? "" : ", ") + mesh.name + " of " + std::to_string(mesh.points.size()) + " vertices";
        }
        throw std::runtime_error(
            options_.file.string() + " has meshes (" + meshes + "), " + std::to_string(character_.joints.size()) +
            " joints, " + std::to_string(character_.animations.size()) +
            " animations, and no skin and no morph targets" + (options_.morphControls ? "" : " that are controls") +
            ": --neural-warp needs a mesh that joints or weights move. Bind it to a skeleton in "
            "the program that it comes from, or import it without --neural-warp");
    }

    // what was said of the roots of the file is no longer so
    void changeParents() {
        std::vector<std::string>& warnings = character_.warnings;
        warnings.erase(std::remove(warnings.begin(), warnings.end(), rootsWarning(character_)), warnings.end());
        reparent(character_, readParents(options_.parents), options_.framesPerSecond);
        if (std::string warning = rootsWarning(character_); !warning.empty())
            warnings.push_back(std::move(warning));
    }

    // the frames of the animation are those that there is something to export of
    WarpSettings settings(const Animation* animation) const {
        WarpSettings settings = options_.warp;
        if (animation != nullptr && !options_.noAnimation)
            settings.lastFrame = lastFrameOf(animation->seconds, options_.framesPerSecond);
        return settings;
    }

    PosedJoints choose(const std::vector<JointRest>& rests, const Animation* animation) {
        const LimitMap* limits = options_.limits.empty() ? nullptr : &limits_.joints;
        PoseChoice choice{limits, limitingAnimations(animation), options_.framesPerSecond, options_.withRoots,
                          options_.limitsMargin};
        choice.hasOthers = options_.morphControls && moveWeights(choice.animations);
        PosedJoints posed = choosePosedJoints(character_, rests, choice);
        append(report_.notes, std::exchange(posed.notes, {}));
        if (options_.limits.empty() && options_.noAnimation && !choice.animations.empty())
            report_.notes.emplace_back("--no-animation leaves the animation out of the scene, and limits of the poses "
                                       "come from it all the same: --limits-from none leaves it out of these, too");
        for (const PosedJoint& joint : posed.joints)
            report_.poseInputs += static_cast<std::size_t>(std::count_if(
                joint.limits.begin(), joint.limits.end(), [](const auto& axis) { return axis.has_value(); }));
        return posed;
    }

    std::vector<const Animation*> limitingAnimations(const Animation* taken) const {
        if (options_.limitsFrom == LimitsFrom::all)
            return allAnimations(character_);
        if (options_.limitsFrom == LimitsFrom::none || taken == nullptr)
            return {};
        return {taken};
    }

    PosedSliders chooseSliders(const CharacterScene& scene, const Animation* animation) {
        const SliderLimitMap* limits = options_.limits.empty() ? nullptr : &limits_.sliders;
        PosedSliders posed = choosePosedSliders(character_, scene, limits, limitingAnimations(animation));
        append(report_.notes, std::exchange(posed.notes, {}));
        report_.poseWeights = posed.sliders.size();
        return posed;
    }

    // limits that nothing becomes of would be lost in silence
    void requireControls(const PosedJoints& joints, const PosedSliders& sliders) const {
        if (!options_.morphControls && !limits_.sliders.empty())
            throw std::runtime_error(options_.limits.string() + " limits the slider \"" +
                                     limits_.sliders.begin()->first + "\", and --no-morph-controls leaves it out");
        if (joints.joints.empty() && sliders.sliders.empty())
            throw std::runtime_error("no joint is left whose turning the deformer could learn from, and no morph "
                                     "target whose weight is a control");
    }

    void tellWhatThereIs(const CharacterScene& scene, const PosedJoints& posed, const PosedSliders& sliders) {
        report_.scene = options_.output.string();
        report_.metersPerUnit = character_.metersPerUnit;
        for (std::size_t i = 0; i < character_.meshes.size(); ++i)
            tellMesh(character_.meshes[i], scene.meshes[i], isDeformed(scene, i, sliders));
        for (std::size_t i = 0; i < character_.joints.size(); ++i)
            report_.joints.push_back({character_.joints[i].name, nodeName(scene.joints[i]), false});
        for (const PosedJoint& joint : posed.joints)
            report_.joints[joint.joint].posed = true;
        for (const Animation& animation : character_.animations)
            tellAnimation(animation);
    }

    void tellAnimation(const Animation& animation) {
        ImportReport::Animation told{animation.name, animation.seconds, false, 0, 0};
        for (const ClipRange& range : clips_.ranges)
            if (range.name == animation.name && !options_.noAnimation)
                told = {animation.name, animation.seconds, true, range.firstFrame, range.lastFrame};
        report_.animations.push_back(told);
    }

    void tellMesh(const CharacterMesh& mesh, const SceneMesh& made, bool isMoved) {
        const std::string node = nodeName(made.mesh);
        const fs::path map = mapFile(options_.output, node, character_.meshes.size());
        report_.meshes.push_back({mesh.name, node, isMoved ? nodeName(made.mover()) : "", mesh.joinedOf.size(),
                                  nameOf(mesh.fileOrder), mesh.points.size(), mesh.polygonSizes.size(),
                                  mesh.bindings.size(), mesh.morphTargets.size(), map.filename().string()});
        if (!isMoved && options_.neuralWarp)
            report_.notes.push_back("the mesh \"" + mesh.name +
                                    "\" follows no joint and no weight, and is no geometry of the deformer");
    }

    void writeLimits(const PosedJoints& posed, const PosedSliders& sliders) const {
        if (options_.writtenLimits.empty())
            return;
        std::vector<std::pair<std::string, JointLimits>> joints;
        for (const PosedJoint& joint : posed.joints)
            joints.emplace_back(character_.joints[joint.joint].name, joint.limits);
        std::vector<std::pair<std::string, ValueRange>> weights;
        for (const PosedSlider& slider : sliders.sliders)
            weights.emplace_back(slider.name, slider.limits);
        const std::string text = limitsText(joints, weights);
        requireUnedited(options_.writtenLimits, text);
        storage::writeWhole(options_.writtenLimits, text);
    }

    void writeFiles(SceneSession& session, const CharacterScene& scene) {
        const fs::path folder = options_.output.parent_path();
        session.moveTo(folder);
        const auto set = [&](const char* attribute, const std::string& text) {
            setText(plugOf(scene.character, attribute), text);
        };
        set("sourceFile", OpenQuarn::pathForScene(options_.file, folder));
        set("vertexMapFile",
            OpenQuarn::pathForScene(mapFile(options_.output, "{mesh}", character_.meshes.size()), folder));
        setNumber(plugOf(scene.character, "framesPerSecond"), options_.framesPerSecond);
        if (!clips_.ranges.empty() && !options_.noAnimation)
            set("clips", clipsText(clips_.ranges));
        // maps before the scene, which knows them by their digests: a scene never goes with the maps of another
        // (decision 0132)
        std::string digests, orders;
        for (std::size_t i = 0; i < report_.meshes.size(); ++i) {
            const std::vector<std::uint32_t>& sceneVertexOf = character_.meshes[i].joinedOf;
            const std::vector<std::int32_t> map(sceneVertexOf.begin(), sceneVertexOf.end());
            log([&] { return "writing " + (folder / report_.meshes[i].vertexMap).string(); });
            storage::writeIntegers(folder / report_.meshes[i].vertexMap, map);
            digests += (i > 0 ? " " : "") + vertexMapDigest(map);
            orders += (i > 0 ? ", " : "") + report_.meshes[i].node + ": " + std::to_string(map.size()) + ' ' +
                      report_.meshes[i].fileOrder;
        }
        set("vertexMapDigests", digests);
        set("fileOrder", orders);
        session.save(options_.output);
    }

    const ImportOptions& options_;
    Character character_;
    Clips clips_;
    PoseLimits limits_;
    ImportReport report_;
};

} // namespace

ImportReport importCharacter(const ImportOptions& given) {
    ImportOptions options = given;
    for (fs::path* path : {&options.file, &options.output, &options.parents, &options.limits, &options.writtenLimits})
        *path = absolutePath(*path);
    checkOutput(options);
    return Import(options).run();
}

} // namespace quarn
