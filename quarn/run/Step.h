// SPDX-License-Identifier: Apache-2.0
// A step of a run, as data: what is started, of what files it makes what files.
#pragma once

#include "quarn/run/RunSettings.h"

#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

/// What a program is asked for that makes the shapes of poses; see docs/run.md. Paths count from the run's folder.
struct TargetRequest {
    std::string mesh;
    std::filesystem::path character, skeleton, scene, rest, skin;
    std::filesystem::path known; ///< shapes of the frames before these, which go before theirs; empty for none
    std::string order;           ///< of vertices
    std::size_t vertices = 0;
    int firstFrame = 0, lastFrame = 0;
    double metersPerUnit = 1.0;
    std::int64_t part = 0;    ///< frames that are asked for at once; 0 for all
    std::int64_t timeout = 0; ///< seconds; 0 for none
    std::size_t frames() const { return static_cast<std::size_t>(lastFrame - firstFrame) + 1; }
};

enum class Program { quarn, trainer, targetCommand };

/// Runs in the run's folder. Own files are named from there, others by whole paths.
struct Step {
    std::string name;  ///< "train"
    std::string mesh;  ///< of several meshes the one it is about; else empty
    std::string round; ///< which of several alike it is, as "2" of rounds, "2.1" of models in one; else empty
    Program program = Program::quarn;
    Words words; ///< behind the program; of a target command all of them
    std::vector<std::filesystem::path> inputs;
    std::vector<std::filesystem::path> outputs;  ///< files, or folders of files
    std::vector<std::filesystem::path> replaced; ///< of these, those that it would not write over: removed before
    std::filesystem::path answer;         ///< where its standard output goes, one of `outputs`; empty for the log
    std::optional<TargetRequest> request; ///< of a target command

    std::string label() const { return joined(' '); }
    std::string joined(char between) const {
        std::string text = name;
        for (const std::string& part : {round, mesh})
            text += part.empty() ? "" : between + part;
        return text;
    }
};

using Plan = std::vector<Step>;

} // namespace quarn
