// SPDX-License-Identifier: Apache-2.0
// --guard: a deformer gives way to the mesh that comes in, the further a pose lies outside of what its model knows.
#pragma once

#include "nw_model/ControlRanges.h"
#include "openquarn/HPlug.h"
#include "quarn/console/json.h"
#include "quarn/scene/AppliedModels.h"

#include <cstddef>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace quarn {

struct Console;

/// What the command line says.
struct GuardOption {
    bool isOn = false;
    double width = 1.0; ///< distance (ControlRanges::distance()) from which on the envelope is 0; above 0
};

/// Adds --guard and --guard-width to a sub-command. `option` must outlive it.
void addGuardOptions(CLI::App& command, GuardOption& option);

/// Part of the envelope that is left at a distance of 0 or more: (1 - min(distance / width, 1)^2)^2, the biweight
/// kernel. Exactly 1 at 0, exactly 0 from the width on, without a corner. Thread: any.
double envelopeLeft(double distance, double width);

/// What a guard has done to one deformer.
struct GuardReport {
    std::string deformer;
    std::size_t frames = 0;  ///< in which a model was on
    std::size_t lowered = 0; ///< of these, with a lower envelope
    std::size_t off = 0;     ///< of these, with an envelope of 0
    double distance = 0.0;   ///< the largest
    int frame = 0;           ///< where it is
};

/// Lowers the envelopes of deformers, for one run: nothing here is saved. What the scene has on an envelope, a number
/// or what is connected into it, stays as a factor. A deformer of several meshes has one envelope, and the model that
/// is furthest from what it knows decides. Thread: main.
class EnvelopeGuard {
public:
    /// Of the deformers of these geometries. `width` above 0. Throws std::runtime_error without any.
    EnvelopeGuard(const std::vector<AppliedModels::Geometry>& geometries, double width);

    /// To be called in a frame before its meshes are evaluated. Throws std::runtime_error with the frame where a model
    /// that is on has no ranges to tell a distance by, where the controls or what is connected into an envelope cannot
    /// be evaluated, and where an envelope is locked.
    void apply(int frame);

    /// A frame that was shown for those after it alone: it does not count in the reports.
    void forget(int frame);

    /// In the order of the deformers' names. A frame that was shown several times counts once.
    std::vector<GuardReport> reports() const;

private:
    struct Model {
        AppliedModels::Geometry place;
        std::optional<neuralWarp::ControlRanges> ranges; ///< none until it has been on
    };
    struct Deformer {
        std::vector<Model> models;
        HPlug envelope, source;          ///< source: what was connected into it; may be null
        double own = 1.0;                ///< without a source
        std::map<int, double> distances; ///< by frame
    };
    static std::optional<double> distanceOf(Deformer& deformer);
    void apply(Deformer& deformer, int frame) const;

    double width_;
    std::map<std::string, Deformer> deformers_;
};

/// A line for each deformer.
std::string guardText(const std::vector<GuardReport>& reports, double width);
void noteGuard(const Console& console, const std::vector<GuardReport>& reports, double width);
/// "guard": {"width", "deformers": [...]}, or null without a report.
void writeGuard(JsonWriter& json, const std::vector<GuardReport>& reports, double width);

} // namespace quarn
