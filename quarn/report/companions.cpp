// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/companions.h"

#include "quarn/console/Console.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/numberText.h"
#include "quarn/process/askProgram.h"

#include <algorithm>
#include <cstdlib>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using Words = std::vector<std::string>;

void append(Words& words, const Words& more) {
    words.insert(words.end(), more.begin(), more.end());
}

// the scene, and what of it is meant
Words wordsOf(const char* command, const Row& row, const FrameRange& frames, const CompanionOptions& options) {
    const MeasuredRow& measured = row.measured;
    Words words{thisProgram().string(), command,      measured.scene.string(), "--deformer",
                measured.deformer,      "--geometry", measured.mesh,           "--frames",
                frameText(frames),      "--quiet"};
    if (!measured.model.isTheScenes)
        append(words, {"--model", measured.model.name});
    for (const std::string& plugin : options.plugins)
        append(words, {"--plugin", plugin});
    return words;
}

// what a quarn that failed says of it: one line, whatever stands around it
std::string sentenceIn(const ProgramAnswer& answer) {
    const std::string mark = "quarn: ", text = "\n" + answer.text;
    const std::size_t found = text.rfind("\n" + mark);
    if (found == std::string::npos)
        return answer.text.empty() ? "it " + answer.end.text() : answer.lastLine();
    const std::size_t begin = found + 1 + mark.size();
    return text.substr(begin, text.find('\n', begin) - begin);
}

// why it failed; empty when it did not
std::string failureOf(Words words) {
    ProgramCall call;
    call.words = std::move(words);
    try {
        const ProgramAnswer answer = askProgram(std::move(call));
        return answer.end.isGood() ? "" : sentenceIn(answer);
    } catch (const Interrupted&) {
        throw;
    } catch (const std::runtime_error& error) {
        return error.what();
    }
}

bool has(const Words& words, const std::string& flag) {
    return std::any_of(words.begin(), words.end(),
                       [&](const std::string& word) { return word == flag || word.rfind(flag + "=", 0) == 0; });
}

// what quarn render is told with a flag; empty where it is not
std::string valueOf(const Words& words, const std::string& flag) {
    for (auto word = words.begin(); word != words.end(); ++word) {
        if (word->rfind(flag + "=", 0) == 0)
            return word->substr(flag.size() + 1);
        if (*word == flag && word + 1 != words.end())
            return word[1];
    }
    return {};
}

// one vertex in ten thousand may have the last colour though it is further away
double rangeOf(const Row& row, const CompanionOptions& options) {
    if (const std::string given = valueOf(options.renderOptions, "--range"); !given.empty())
        return std::strtod(given.c_str(), nullptr);
    if (options.range > 0.0)
        return options.range;
    const double before = row.measured.before.percentile(0.9999);
    return roundedUp(before > 0.0 ? before : row.measured.after.largest());
}

std::string pictureName(const std::string& file, int frame) {
    std::string digits = std::to_string(std::abs(frame));
    digits.insert(0, digits.size() < 4 ? 4 - digits.size() : 0, '0');
    return file + "." + (frame < 0 ? "-" : "") + digits + ".png";
}

Words renderWords(const Row& row, int frame, const CompanionOptions& options, const fs::path& pattern) {
    const MeasuredRow& measured = row.measured;
    Words words = wordsOf("render", row, {frame, frame, 1}, options);
    append(words, {"--panel", "skin=" + measured.skinPlug, "--panel", "target=" + measured.targetPlug, "--panel",
                   "neural=" + measured.meshPlug, "--heat", "before=" + measured.skinPlug + ":" + measured.targetPlug,
                   "--heat", "after=" + measured.meshPlug + ":" + measured.targetPlug, "-o", pattern.string()});
    if (!has(options.renderOptions, "--size"))
        append(words, {"--size", "480x480"});
    if (!has(options.renderOptions, "--range"))
        append(words, {"--range", numberText(row.pictureRange)});
    if (!options.view.empty() && !has(options.renderOptions, "--view"))
        append(words, {"--view", options.view});
    append(words, options.renderOptions);
    return words;
}

std::string captionOf(const Row& row, int frame) {
    const auto& frames = row.measured.after.frames();
    const FrameRange& range = row.measured.frames;
    const MeanAndMax& left = frames[static_cast<std::size_t>((frame - range.first) / range.step)];
    return row.measured.name + ", frame " + std::to_string(frame) +
           (frame == row.measured.after.worstFrame() ? ", the worst one" : "") + ": " + lengthText(left.mean) +
           " in the mean and " + lengthText(left.max) + " at most are left";
}

} // namespace

std::string fileNameFor(const std::string& name, std::vector<std::string>& taken) {
    std::string file;
    for (const char character : name)
        file += std::string_view("-_.").find(character) != std::string_view::npos ||
                        (character >= '0' && character <= '9') || (character >= 'a' && character <= 'z') ||
                        (character >= 'A' && character <= 'Z')
                    ? character
                    : '_';
    if (file.empty() || file.front() == '.' || file.front() == '-')
        file.insert(0, "_");
    std::string free = file;
    for (int number = 2; std::find(taken.begin(), taken.end(), free) != taken.end(); ++number)
        free = file + "-" + std::to_string(number);
    taken.push_back(free);
    return free;
}

std::vector<int> drawnFrames(const FrameRange& frames, int worst, int count) {
    std::vector<int> drawn;
    if (count < 1)
        return drawn;
    drawn.push_back(worst);
    const std::size_t others = std::min(frames.count(), static_cast<std::size_t>(count - 1));
    for (std::size_t i = 0; i < others; ++i) // in the middle of as many parts
        if (const int frame = frames.frame((2 * i + 1) * frames.count() / (2 * others)); frame != worst)
            drawn.push_back(frame);
    return drawn;
}

void addPictures(Row& row, const std::string& file, const CompanionOptions& options, const Console& console) {
    row.pictureRange = rangeOf(row, options);
    for (const int frame : drawnFrames(row.measured.frames, row.measured.after.worstFrame(), options.pictures)) {
        const fs::path place = options.folder / "pictures" / pictureName(file, frame);
        if (const std::string why = failureOf(renderWords(row, frame, options, place)); !why.empty()) {
            row.whyNoPictures = "There are no pictures: " + why;
            return console.warn(row.measured.name + ": " + row.whyNoPictures);
        }
        row.pictures.push_back({place, captionOf(row, frame)});
    }
}

void addViewer(Row& row, const std::string& file, const CompanionOptions& options, const Console& console) {
    if (!options.hasViewer)
        return;
    const std::string name = file + ".html";
    Words words = wordsOf("view", row, row.measured.frames, options);
    append(words, {"-o", (options.folder / name).string(), "--title", row.measured.name});
    const std::string own = valueOf(options.renderOptions, "--view");
    const std::string& view = options.view.empty() ? own : options.view;
    if (view.find(',') != std::string::npos)
        append(words, {"--view", view});
    const std::string why = failureOf(std::move(words));
    if (why.empty()) {
        row.viewer = name;
        return;
    }
    row.whyNoViewer = "There is no page to turn it in the browser: " + why;
    console.warn(row.measured.name + ": " + row.whyNoViewer);
}

} // namespace quarn
