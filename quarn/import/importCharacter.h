// SPDX-License-Identifier: Apache-2.0
// From a character file to a scene file.
#pragma once

#include "quarn/console/Console.h"
#include "quarn/import/warpSetup.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// Whose range limits of poses are: the animations' that are taken, those of all in the file, or of none.
enum class LimitsFrom { animation, all, none };

/// What the user has said.
struct ImportOptions {
    std::filesystem::path file;
    std::filesystem::path output;
    double framesPerSecond = 24.0;
    std::vector<std::string> animations; ///< by name, laid one after another; "all" for all; empty for the first
    bool noAnimation = false;            ///< no curves; limits of poses still come from `animations`
    std::filesystem::path parents;       ///< see readParents(); empty for none
    std::optional<double> metersPerUnit;
    bool neuralWarp = false;
    WarpSettings warp;
    bool morphControls = true;                     ///< weights of morph targets are controls
    std::filesystem::path limits;                  ///< see readLimits(); empty for none
    LimitsFrom limitsFrom = LimitsFrom::animation; ///< without those
    double limitsMargin = 0.0;                     ///< of these, see PoseChoice::margin
    std::filesystem::path writtenLimits;           ///< where the limits go, to be edited; empty for nowhere
    bool withRoots = false;
    std::vector<std::string> plugins;
};

/// What was made: the names of the character's things, and of the nodes that they are now.
struct ImportReport {
    struct Mesh {
        std::string name;
        std::string node;
        std::string skin; ///< what moves it: a skin, or the shapes of a geometry that has none; empty for none of both
        std::size_t fileVertices = 0;
        std::string fileOrder;    ///< what these are: nameOf(FileOrder)
        std::size_t vertices = 0; ///< after joining
        std::size_t polygons = 0;
        std::size_t joints = 0;
        std::size_t morphTargets = 0;
        std::string vertexMap; ///< the file, as the scene names it
    };
    struct Joint {
        std::string name;
        std::string node;
        bool posed = false; ///< has controls
    };
    struct Animation {
        std::string name;
        double seconds = 0.0;
        bool used = false;
        int firstFrame = 0; ///< where it lies in the scene, if it is used
        int lastFrame = 0;
    };
    std::string scene;
    std::vector<Mesh> meshes;
    std::vector<Joint> joints;
    std::vector<Animation> animations;
    std::size_t curves = 0;
    std::size_t poseInputs = 0;  ///< angles that sampling sets; 0 without a deformer
    std::size_t poseWeights = 0; ///< weights of morph targets, likewise
    double metersPerUnit = 1.0;
    std::vector<std::string> warnings; ///< sentences without a full stop
    std::vector<std::string> notes;    ///< the same
};

/// Reads the file and writes the scene and the vertex maps beside it, each as a whole. Throws std::runtime_error with
/// the sentence for the user; nothing of the scene is then written. Thread: main, with no session open.
ImportReport importCharacter(const ImportOptions& options);

/// A line a mesh, then joints, animations and files. Without notes and warnings.
std::string reportText(const ImportReport& report);
/// All of it.
std::string reportJson(const ImportReport& report);

} // namespace quarn
