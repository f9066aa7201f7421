// SPDX-License-Identifier: Apache-2.0
#include "quarn/character/readCharacter.h"

#include "quarn/character/animations.h"
#include "quarn/character/controlPoints.h"
#include "quarn/character/filesBeside.h"
#include "quarn/character/importedFile.h"
#include "quarn/character/importerLog.h"
#include "quarn/character/prepareGltf.h"
#include "quarn/character/readApart.h"
#include "quarn/character/skinnedMeshes.h"
#include "quarn/character/transfer.h"
#include "quarn/console/interrupt.h"

#include <assimp/BaseImporter.h>
#include <assimp/Importer.hpp>
#include <assimp/config.h>
#include <assimp/importerdesc.h>

#include <cmath>
#include <memory>
#include <sstream>
#include <stdexcept>

namespace quarn {
namespace {

// leaves the one importer that the ending stands for: a file is never taken for something else
void keepImporterOf(Assimp::Importer& importer, const std::string& ending) {
    const std::string wanted = isGltf(ending)     ? "glTF2 Importer"
                               : ending == ".fbx" ? "Autodesk FBX Importer"
                                                  : "Collada Importer";
    for (std::size_t i = importer.GetImporterCount(); i-- > 0;) {
        if (importer.GetImporterInfo(i)->mName == wanted)
            continue;
        const std::unique_ptr<Assimp::BaseImporter> other(importer.GetImporter(i));
        importer.UnregisterLoader(other.get());
    }
    if (importer.GetImporterCount() == 0)
        throw std::runtime_error("this build of Assimp has no importer for " + ending);
}

void configure(Assimp::Importer& importer) {
    importer.SetPropertyBool(AI_CONFIG_IMPORT_REMOVE_EMPTY_BONES, false);
    importer.SetPropertyBool(AI_CONFIG_IMPORT_FBX_PRESERVE_PIVOTS, false);
    importer.SetPropertyBool(AI_CONFIG_IMPORT_FBX_READ_TEXTURES, false);
    importer.SetPropertyBool(AI_CONFIG_IMPORT_FBX_READ_CAMERAS, false);
    importer.SetPropertyBool(AI_CONFIG_IMPORT_FBX_READ_LIGHTS, false);
}

// glTF is in meters and Collada is brought to them by its root; FBX says how many centimeters its unit has
double metersPerUnit(const aiScene& scene, const std::string& ending) {
    if (ending != ".fbx" || scene.mMetaData == nullptr)
        return 1.0;
    double centimeters = 1.0;
    float single = 1.0F;
    if (!scene.mMetaData->Get("UnitScaleFactor", centimeters) && scene.mMetaData->Get("UnitScaleFactor", single))
        centimeters = static_cast<double>(single);
    if (!std::isfinite(centimeters) || centimeters <= 0.0)
        throw std::runtime_error("the unit is " + std::to_string(centimeters) + " centimeters");
    return centimeters * 0.01;
}

Character convert(const aiScene& scene, const SourceHints& hints, const std::string& ending, const std::string& bytes) {
    Character character;
    character.warnings = hints.warnings;
    character.metersPerUnit = metersPerUnit(scene, ending);
    const Skeleton skeleton = readSkeleton(scene, hints, character);
    ControlPoints control = isGltf(ending) ? ControlPoints() : ControlPoints(bytes, ending);
    const MeshIndices meshes = readMeshes(scene, skeleton, hints, control, character);
    if (character.meshes.empty())
        throw std::runtime_error("the file has no mesh");
    readAnimations(scene, skeleton, meshes, hints, character);
    return character;
}

Character importFile(const std::string& path, const std::string& ending, std::string bytes) {
    SourceHints hints;
    if (isGltf(ending))
        bytes = prepareGltf(bytes, hints, [&](const std::string& uri) { return readBeside(path, uri, "buffer"); });
    const ImporterLog log(hints.warnings);
    Assimp::Importer importer;
    keepImporterOf(importer, ending);
    configure(importer);
    importer.SetIOHandler(new ImportedFile(path, bytes)); // the importer owns it
    const aiScene* scene = importer.ReadFile(path, 0);
    if (scene == nullptr)
        throw std::runtime_error(importer.GetErrorString());
    if (scene->mRootNode == nullptr)
        throw std::runtime_error("the file has no scene");
    return convert(*scene, hints, ending, bytes);
}

Character readFile(const std::string& path) {
    const std::string ending = lowerEnding(path);
    if (!isGltf(ending) && ending != ".fbx" && ending != ".dae")
        throw std::runtime_error("\"" + ending + "\" is not one of the endings .gltf, .glb, .fbx and .dae");
    const std::string bytes = readCharacterBytes(path);
    return unpackCharacter(importApart([&] { return packCharacter(importFile(path, ending, bytes)); }));
}

} // namespace

Character readCharacter(const std::string& path) {
    try {
        return readFile(path);
    } catch (const std::bad_alloc&) {
        throw std::runtime_error(path + ": not enough memory for this file");
    } catch (const Interrupted&) {
        throw;
    } catch (const std::exception& error) {
        throw std::runtime_error(path + ": " + error.what());
    }
}

const char* nameOf(FileOrder order) {
    constexpr const char* names[] = {"vertices", "control points", "corners"};
    return names[static_cast<std::size_t>(order)];
}

std::string describeCharacter(const Character& character) {
    std::ostringstream text;
    for (const CharacterMesh& mesh : character.meshes)
        text << "mesh " << mesh.name << ": " << mesh.joinedOf.size() << ' ' << nameOf(mesh.fileOrder)
             << " in the file, joined to " << mesh.points.size() << "; " << mesh.polygonSizes.size() << " polygons, "
             << mesh.bindings.size() << " joints"
             << (mesh.morphTargets.empty() ? "" : ", " + std::to_string(mesh.morphTargets.size()) + " morph targets")
             << '\n';
    text << "joints: " << character.joints.size() << '\n';
    for (const Animation& animation : character.animations)
        text << "animation " << animation.name << ": " << animation.seconds << " s, " << animation.channels.size()
             << " joints\n";
    for (const std::string& warning : character.warnings)
        text << "warning: " << warning << '\n';
    return text.str();
}

} // namespace quarn
