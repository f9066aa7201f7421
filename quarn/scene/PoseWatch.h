// SPDX-License-Identifier: Apache-2.0
// Whether the models of a scene know the poses that they are shown.
#pragma once

#include "quarn/scene/AppliedModels.h"
#include "quarn/scene/PoseCounter.h"

#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// What there is to say of one model.
struct PoseReport {
    std::string deformer, geometry, model; ///< names; the model's as models[i].modelName has it
    std::string why;                       ///< what is missing, a sentence: no certificate, or no trained poses
    bool hasCertificate = false;
    PoseCounts counts; ///< of no frame without a certificate
};

/// Looks at the controls of deformers after each frame, outside of what is timed. Thread: main.
class PoseWatch {
public:
    /// Of the geometries of deformers that the meshes behind `models` depend on.
    explicit PoseWatch(const AppliedModels& models);

    /// To be called in a frame that has been evaluated. Models that are off do not count; a model's files are read the
    /// first time that it is on. Throws std::runtime_error where the controls cannot be evaluated.
    void look(int frame);

    /// Of the models that were on in a frame.
    std::vector<PoseReport> reports() const;

private:
    struct Watched {
        AppliedModels::Geometry geometry;
        PoseReport report; ///< without the counts
        bool isRead = false;
        std::optional<PoseCounter> counter;
    };
    static void read(Watched& one);

    std::vector<Watched> watched_;
};

/// The control values of a deformer in the present frame. Throws std::runtime_error. Thread: main.
std::vector<float> controlsOf(const Warp& warp);

} // namespace quarn
