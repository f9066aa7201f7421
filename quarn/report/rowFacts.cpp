// SPDX-License-Identifier: Apache-2.0
#include "quarn/report/Report.h"
#include "quarn/report/html.h"
#include "quarn/report/pageParts.h"

#include "quarn/console/Console.h"
#include "quarn/console/numberText.h"
#include "quarn/scene/poseTexts.h"

#include <cmath>

namespace quarn {
namespace {

class FactList {
public:
    void add(const std::string& name, const std::string& text) {
        if (!text.empty())
            html_ += said("dt", name) + said("dd", text) + "\n";
    }
    const std::string& html() const { return html_; }

private:
    std::string html_;
};

std::string joined(const Facts& facts) {
    std::string text;
    for (const auto& [name, value] : facts)
        text += (text.empty() ? "" : ", ") + name + " " + value;
    return text;
}

std::string filesText(const ModelFacts& model) {
    std::string text = sizeText(model.bytes());
    const char* before = ": ";
    for (const auto& [name, bytes] : model.files) {
        text += before + name + " " + sizeText(bytes);
        before = ", ";
    }
    return text;
}

std::string trainingText(const TrainingRecord& training) {
    std::string text;
    if (training.epochs)
        text += counted(static_cast<std::uint64_t>(*training.epochs), "epoch");
    if (training.bestEpoch)
        text += ", the best is " + std::to_string(*training.bestEpoch);
    if (training.seconds)
        text += ", " + durationText(*training.seconds);
    if (!training.device.empty())
        text += " on " + training.device;
    if (training.threads)
        text += ", " + counted(static_cast<std::uint64_t>(*training.threads), "thread");
    if (training.seed)
        text += ", seed " + std::to_string(*training.seed);
    return text + (training.isInterrupted ? "; it was interrupted" : "");
}

std::string modelText(const ModelFacts& model) {
    return model.name + ": " + model.mode + " deltas" +
           (model.mode == "surface" ? ", " + counted(model.smoothing, "smoothing pass") : "") +
           (model.kind == "principal" ? ", " + counted(model.shapes, "principal shape")
                                      : ", without principal shapes") +
           (model.controls ? ", " + counted(*model.controls, "control") : "") +
           (model.poses ? ", trained on " + counted(*model.poses, "pose") : "");
}

std::string jitterText(const MeasuredRow& row) {
    const MeanAndMax before = row.before.errorJitter(), after = row.after.errorJitter();
    return "of what is left " + fixedText(after.mean, 4) + " mm in the mean and " + fixedText(after.max, 3) +
           " mm at most (before " + fixedText(before.mean, 4) + " and " + fixedText(before.max, 3) + "); of the mesh " +
           fixedText(row.after.jitter(), 3) + " mm at most, of the target " + fixedText(row.targetJitter, 3) +
           ", of the skin " + fixedText(row.before.jitter(), 3);
}

} // namespace

std::string factsOf(const Report& report, const Row& row) {
    const MeasuredRow& measured = row.measured;
    FactList list;
    list.add("Mesh", measured.mesh + ", " + std::to_string(measured.vertices) + " vertices" +
                         (measured.diagonal > 0.0
                              ? ", " + numberText(std::round(measured.diagonal * 10.0) / 10.0) + " mm across its box"
                              : ""));
    list.add("Scene", measured.scene.filename().string() + ", " + counted(measured.frames.count(), "frame") + " from " +
                          std::to_string(measured.frames.first) + " to " + std::to_string(measured.frames.last));
    list.add("Model", modelText(measured.model));
    list.add("", measured.model.note);
    list.add("Size", filesText(measured.model));
    if (report.isMotion)
        list.add("Jitter", jitterText(measured));
    list.add("Poses", posesText(measured.poses));
    if (row.training) {
        list.add("Training", trainingText(*row.training));
        list.add("Trained with", joined(row.training->versions));
    }
    std::string text = "<dl>\n" + list.html() + "</dl>\n";
    if (row.training && !row.training->settings.empty()) {
        FactList settings;
        for (const auto& [name, value] : row.training->settings)
            settings.add(name, value);
        text += "<details><summary>Settings of the training</summary><dl>\n" + settings.html() + "</dl></details>\n";
    }
    return text;
}

} // namespace quarn
