// SPDX-License-Identifier: Apache-2.0
// The models that decide what a mesh looks like. The deformer applies some that cannot be right, without a word: what
// quarn delivers is checked here.
#pragma once

#include "openquarn/HPlug.h"
#include "quarn/scene/Warp.h"

#include <stdexcept>
#include <utility>
#include <vector>

namespace quarn {

/// The geometries of deformers that some mesh plugs depend on. Thread: main.
class AppliedModels {
public:
    struct Geometry {
        Warp warp;
        WarpGeometry geometry;
    };

    /// Null plugs are passed over.
    explicit AppliedModels(const std::vector<HPlug>& meshes);

    const std::vector<Geometry>& geometries() const { return geometries_; }

    /// Somebody else sets envelopes from now on: that of a deformer that does not apply its model may rise again.
    void setGuarded() { isGuarded_ = true; }

    /// To be called after a frame has been evaluated without an error. The first time that a deformer applies its model
    /// (switched on, envelope not 0, not replaced by a target morph), looks into the model directory and at the rest
    /// mesh; later frames cost nothing then. Throws std::runtime_error that names deformer, model and reason when the
    /// files are damaged, or when the rest mesh has another number of vertices than the one that is deformed.
    void requireSound();

    /// Does `work`, which evaluates a frame. When it throws std::runtime_error, and requireSound() has something to
    /// say, that is what comes out: the failure follows from damaged files, which it does not name.
    template <class Work>
    auto blame(Work&& work) {
        try {
            return std::forward<Work>(work)();
        } catch (const std::runtime_error&) {
            requireSound();
            throw;
        }
    }

private:
    static bool isApplied(const Geometry& geometry);
    static bool canChange(const Geometry& geometry);
    static void requireSound(const Geometry& geometry);

    std::vector<Geometry> geometries_, unchecked_;
    bool isGuarded_ = false;
};

} // namespace quarn
