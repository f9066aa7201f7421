// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/RunSettings.h"

#include "quarn/console/UsageError.h"
#include "quarn/console/numberText.h"

#include <algorithm>
#include <cmath>
#include <limits>

namespace quarn {
namespace {

namespace fs = std::filesystem;

bool isFile(const fs::path& path) {
    std::error_code error;
    return fs::is_regular_file(path, error);
}

// the part of a word that may name a file: behind "--flag=" or "MESH=", unless all of it names one
std::size_t beginOfFile(const std::string& word, const fs::path& base) {
    const std::size_t equals = word.find('=');
    return equals == std::string::npos || isFile(base / word) ? 0 : equals + 1;
}

std::string wholeFile(const std::string& word, const fs::path& base) {
    const std::size_t begin = beginOfFile(word, base);
    return word.substr(0, begin) + (base / word.substr(begin)).lexically_normal().string();
}

// of caches each word names a file, whether it is there or not
void makeWhole(Words& caches, const fs::path& base) {
    for (std::string& word : caches)
        word = wholeFile(word, base);
}

void requireRange(const char* name, const std::optional<std::int64_t>& value, std::int64_t least) {
    constexpr std::int64_t most = 9'999'999;
    if (value && (*value < least || *value > most))
        throw UsageError(std::string(name) + " is " + std::to_string(*value) + ", not a whole number from " +
                         std::to_string(least) + " to " + std::to_string(most));
}

void requireOneOf(const char* name, const std::string& value, std::initializer_list<const char*> choices) {
    std::string names;
    for (const char* choice : choices) {
        if (value.empty() || value == choice)
            return;
        names += (names.empty() ? "" : ", ") + std::string(choice);
    }
    throw UsageError(std::string(name) + " is \"" + value + "\", not one of " + names);
}

// of rounds: three where nobody has said
std::int64_t stepOf(const RunSettings& settings) {
    return settings.refineStep.value_or((*settings.refineTo - settings.sampleCount() + 2) / 3);
}

void checkRefining(const RunSettings& settings) {
    if (!settings.refines() && (settings.refineStep || settings.ensemble || settings.ensembleEpochs))
        throw UsageError("--refine-step, --ensemble and --ensemble-epochs are for --refine-to N");
    requireRange("refine-to", settings.refineTo, 3);
    requireRange("refine-step", settings.refineStep, 1);
    requireRange("ensemble", settings.ensemble, 2);
    requireRange("ensemble-epochs", settings.ensembleEpochs, 1);
    if (!settings.refines())
        return;
    if (*settings.refineTo <= settings.sampleCount())
        throw UsageError("refine-to is " + std::to_string(*settings.refineTo) + ", and there are " +
                         std::to_string(settings.sampleCount()) + " samples to begin with: it is the number of all");
    if (settings.targetCommand.empty())
        throw UsageError("--refine-to needs a --target-command: what is added is not known before, and its targets are "
                         "made meanwhile");
    if (!settings.from.empty() && settings.from != "limits")
        throw UsageError("--refine-to begins with poses from limits: from is \"" + settings.from + "\"");
    if (settings.rounds() > 100)
        throw UsageError("--refine-step " + std::to_string(*settings.refineStep) + " makes " +
                         std::to_string(settings.rounds()) + " rounds: at most 100 are made");
}

void checkSkins(const RunSettings& settings) {
    const bool hasMotion = !settings.motion.empty();
    if (settings.skins.empty() && settings.motionSkins.empty())
        return;
    if (settings.refines())
        throw UsageError("--skin is not for --refine-to: what is added is not known before, and the skin of it is "
                         "quarn's own");
    if (settings.skins.empty())
        throw UsageError("--motion-skin is the skin of a motion: give that of the poses as well, with --skin");
    if (hasMotion == settings.motionSkins.empty())
        throw UsageError(hasMotion ? "--motion has to have a skin as well: give it with --motion-skin"
                                   : "--motion-skin is the skin of a motion: give it with --motion");
    if (!settings.hasTargets())
        throw UsageError("--skin is what corrections are learned on: give it with --targets or a --target-command");
}

} // namespace

std::int64_t RunSettings::rounds() const {
    return refines() ? (*refineTo - sampleCount() + stepOf(*this) - 1) / stepOf(*this) : 0;
}

std::int64_t RunSettings::addedIn(std::int64_t round) const {
    return std::min(stepOf(*this), *refineTo - sampleCount() - (round - 1) * stepOf(*this));
}

Words withWholePaths(const Words& words, const fs::path& base) {
    Words whole;
    whole.reserve(words.size());
    for (const std::string& word : words) {
        const std::string file = wholeFile(word, base);
        whole.push_back(isFile(file.substr(beginOfFile(file, base))) ? file : word);
    }
    return whole;
}

void resolve(RunSettings& settings, const fs::path& base) {
    for (fs::path* path : {&settings.character, &settings.parents, &settings.limits, &settings.motion})
        if (!path->empty())
            *path = (base / *path).lexically_normal();
    for (Words* caches : {&settings.targets, &settings.motionTargets, &settings.skins, &settings.motionSkins})
        makeWhole(*caches, base);
    for (Words* words :
         {&settings.importOptions, &settings.poseOptions, &settings.targetOptions, &settings.exportOptions,
          &settings.trainOptions, &settings.renderOptions, &settings.reportOptions, &settings.targetCommand})
        *words = withWholePaths(*words, base);
}

void check(const RunSettings& settings) {
    if (settings.character.empty())
        throw UsageError("CHARACTER is missing: the file of a rigged character, here or in a recipe");
    requireRange("samples", settings.samples, 2);
    requireRange("held-out", settings.heldOut, 3);
    requireRange("seed", settings.seed, 0);
    requireRange("epochs", settings.epochs, 1);
    checkRefining(settings);
    checkSkins(settings);
    requireRange("target-timeout", settings.targetTimeout, 1);
    requireRange("target-part", settings.targetPart, 1);
    requireOneOf("from", settings.from, {"limits", "animation", "both"});
    requireOneOf("order", settings.order, {"scene", "file", "rest"});
    if (settings.scale && !(std::isfinite(*settings.scale) && *settings.scale > 0.0))
        throw UsageError("scale is " + numberText(*settings.scale) + ", not a number above 0");
    for (const auto& [name, given] :
         {std::pair("activation-rate", settings.activationRate), std::pair("limit-rate", settings.limitRate)}) {
        const double rate = given.value_or(0.0);
        if (!std::isfinite(rate) || rate < 0.0 || rate > 1.0)
            throw UsageError(name + (" is " + numberText(rate)) + ", not a number from 0 to 1");
    }
    if (settings.from == "animation" && (settings.samples || settings.activationRate || settings.limitRate))
        throw UsageError("samples, activation-rate and limit-rate are for poses from limits: from is \"animation\"");
    if (!settings.targets.empty() && !settings.targetCommand.empty())
        throw UsageError("targets come from --targets or from --target-command, not from both");
    if (!settings.motion.empty() && settings.heldOut)
        throw UsageError("held-out poses or a motion: give --held-out or --motion, not both");
    if (!settings.motionTargets.empty() && settings.motion.empty())
        throw UsageError("--motion-targets are the shapes of a motion: give it with --motion");
    if (!settings.motion.empty() && !settings.targets.empty() && settings.motionTargets.empty())
        throw UsageError("--motion has to have targets as well: give them with --motion-targets");
    const bool isOther = settings.scale || !settings.axes.empty() || settings.order == "rest";
    if (!settings.targetCommand.empty() && isOther)
        throw UsageError(
            "--axes, --scale and --order rest are for --targets: a target command writes what it is given");
    if (settings.targetCommand.empty() && (settings.targetTimeout || settings.targetPart))
        throw UsageError("--target-timeout and --target-part are for a --target-command");
}

} // namespace quarn
