// SPDX-License-Identifier: Apache-2.0
// What a run is asked for: one table of names, which are flags on the command line and keys in a recipe.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

using Words = std::vector<std::string>;

struct RunSettings {
    std::filesystem::path character;
    std::filesystem::path parents, limits, motion;
    std::optional<std::int64_t> samples, heldOut, seed, epochs, targetTimeout, targetPart;
    std::optional<std::int64_t> refineTo, refineStep, ensemble, ensembleEpochs;
    std::optional<double> activationRate, limitRate, scale;
    std::string from, order, axes;
    bool align = false, anyway = false;
    Words targets, motionTargets, skins, motionSkins; ///< FILE, or MESH=FILE
    Words targetCommand;
    Words importOptions, poseOptions, targetOptions, exportOptions, trainOptions, renderOptions,
        reportOptions; ///< words for these commands

    std::int64_t sampleCount() const { return samples.value_or(1000); }
    bool refines() const { return refineTo.has_value(); }
    /// Rounds in which poses are added, and how many in the round, from 1 on.
    std::int64_t rounds() const;
    std::int64_t addedIn(std::int64_t round) const;
    bool hasTargets() const { return !targets.empty() || !targetCommand.empty(); }
};

/// Calls visit(name, pointer to the member, kind of its value, help) for each setting that is a flag and a key.
template <class Visit>
void visitSettings(const Visit& visit) {
    using Settings = RunSettings;
    visit("parents", &Settings::parents, "FILE", "What joint hangs below which, as for quarn import");
    visit("limits", &Settings::limits, "FILE", "How far joints turn, as for quarn import");
    visit("samples", &Settings::samples, "N", "Poses to train with, 2 or more [1000]");
    visit("held-out", &Settings::heldOut, "N",
          "Poses that follow these and are never trained, 3 or more [a tenth of the samples; none with --motion]");
    visit("from", &Settings::from, "limits|animation|both", "Where poses come from [limits]");
    visit("activation-rate", &Settings::activationRate, "R", "How likely a value leaves its default, 0 to 1");
    visit("limit-rate", &Settings::limitRate, "R", "How likely such a value stands at one of its limits, 0 to 1 [0]");
    visit("seed", &Settings::seed, "S", "Of poses and training; another one gives others [1]");
    visit("refine-to", &Settings::refineTo, "N", "Poses in the end: those added stand where models disagree most");
    visit("refine-step", &Settings::refineStep, "N", "Poses added in a round [a third of those to add]");
    visit("ensemble", &Settings::ensemble, "N", "Models that are trained and compared in a round, 2 or more [3]");
    visit("ensemble-epochs", &Settings::ensembleEpochs, "N", "Of these trainings [as of the last]");
    visit("motion", &Settings::motion, "KEYS", "A motion that is never trained, as for quarn pose --keys");
    visit("targets", &Settings::targets, "[MESH=]FILE", "The shapes of the poses, a point cache; may be repeated");
    visit("motion-targets", &Settings::motionTargets, "[MESH=]FILE", "The shapes of the motion, likewise");
    visit("skin", &Settings::skins, "[MESH=]FILE", "The skin of the poses in the place of quarn's own, likewise");
    visit("motion-skin", &Settings::motionSkins, "[MESH=]FILE", "That of the motion, likewise");
    visit("target-timeout", &Settings::targetTimeout, "SECONDS", "How long a target command may take [without end]");
    visit("target-part", &Settings::targetPart, "N", "Frames that a target command is asked for at once [all]");
    visit("order", &Settings::order, "scene|file|rest", "Whose vertices targets, and the skins for them, have [scene]");
    visit("axes", &Settings::axes, "AXES", "The axes of targets, as for quarn target");
    visit("scale", &Settings::scale, "FACTOR", "Units of the scene in a unit of targets, likewise");
    visit("align", &Settings::align, "", "Mend targets that do not fit the skin, likewise");
    visit("anyway", &Settings::anyway, "", "Take targets that do not fit the skin");
    visit("epochs", &Settings::epochs, "N", "Of the training [the node's]");
    visit("import-option", &Settings::importOptions, "WORD", "A word more for quarn import; may be repeated");
    visit("pose-option", &Settings::poseOptions, "WORD", "A word more for quarn pose; may be repeated");
    visit("target-option", &Settings::targetOptions, "WORD", "A word more for quarn target; may be repeated");
    visit("export-option", &Settings::exportOptions, "WORD", "A word more for quarn export; may be repeated");
    visit("train-option", &Settings::trainOptions, "WORD", "A word more for trainer train; may be repeated");
    visit("render-option", &Settings::renderOptions, "WORD", "A word more for quarn render; may be repeated");
    visit("report-option", &Settings::reportOptions, "WORD", "A word more for quarn report; may be repeated");
}

/// The same words, those that name a file, and those like --flag=FILE, with the whole path of it. `base` is the folder
/// from which they count.
Words withWholePaths(const Words& words, const std::filesystem::path& base);

/// Makes what is relative whole, as seen from `base`.
void resolve(RunSettings& settings, const std::filesystem::path& base);

/// Throws UsageError with a sentence that names the setting and its value, for what no run can be asked for.
void check(const RunSettings& settings);

} // namespace quarn
