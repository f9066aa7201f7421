// SPDX-License-Identifier: Apache-2.0
// A deformer whose inputs are animated, made by chance from what a test wishes for.
#pragma once

#include "openquarn_app/Gpu.h"
#include "plugin/deformer/gpu/limits.h"
#include "plugin/deformer/support/modelFolder.h"
#include "plugin/deformer/support/warpRig.h"
#include "plugin/deformer/sweep.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace parity {

struct GeometryWish {
    ZooMesh mesh;
    std::uint32_t deltaMode = 0;
    std::uint32_t passes = 0;
    std::size_t shapes = 0;   ///< 0: the outputs are the deltas
    bool isPart = false;      ///< some vertices only, in any order
    bool isOtherPart = false; ///< the model is of other vertices, in any order: not all have a slot
    bool isWeighted = false;
    bool isModelOn = true;
};

struct Wish {
    std::vector<GeometryWish> geometries;
    double envelope = 1.0;
    std::optional<double> morph = {}; ///< its envelope; none: disabled
};

class Scene {
public:
    /// `before`: the deformer whose geometries of the same numbers come in; it outlives this one.
    Scene(const std::filesystem::path& folder, std::uint32_t seed, const Wish& wish, const std::string& name = "warp1",
          const Scene* before = nullptr);

    /// Moves all that is animated. The same seed gives the same frame.
    void pose(std::uint32_t seed) const;
    /// Evaluates as the host sees fit.
    HStatus evaluate(std::size_t geometry = 0) const;
    /// Evaluates this deformer and those before it on the CPU.
    HStatus deform(std::size_t geometry = 0) const;
    HPointArray result(std::size_t geometry = 0) const { return rig.result(index(geometry)); }
    HPointArray input(std::size_t geometry = 0) const;

    std::size_t geometryCount() const { return all_.size(); }
    neuralWarp::neuralWarpData& state(std::size_t geometry = 0) const { return *rig.state(index(geometry)); }
    const ModelSpec& model(std::size_t geometry = 0) const { return all_[geometry].model; }
    std::filesystem::path modelDirectory(std::size_t geometry = 0) const;
    /// Whether the device has nothing to do it with: the host's message is then no surprise.
    bool isForTheCpu(std::size_t geometry) const;
    bool appliesModel(std::size_t geometry) const;
    bool isMorphed() const { return wish_.morph.has_value(); }

    /// Launches of each kernel in one evaluation, and the bytes that go up when nothing but the animation changed.
    std::map<std::string, std::uint64_t> launches(std::size_t geometry = 0) const;
    std::map<std::string, std::uint64_t> uploads(std::size_t geometry = 0) const;
    std::uint64_t bytesUp(std::size_t geometry = 0) const;
    std::uint64_t positionBytes(std::size_t geometry = 0) const {
        return std::uint64_t{12} * all_[geometry].base.length();
    }

    /// What limits are relative to, for these results.
    double size(std::size_t geometry, const HPointArray& result) const;
    const Limits& limits(std::size_t geometry) const;

    warpRig::Rig rig;

private:
    struct Geometry {
        GeometryWish wish;
        HObject mesh;
        HPointArray base = {};
        std::optional<std::vector<unsigned>> affected = {};
        std::vector<float> weights = {};
        ModelSpec model = {};
    };
    static unsigned index(std::size_t geometry) { return static_cast<unsigned>(3 * geometry); }
    std::string modelName(std::size_t geometry) const { return name_ + "model" + std::to_string(geometry); }
    void add(const GeometryWish& wish, Dice& dice);
    void chooseVertices(Geometry& geometry, Dice& dice) const;
    void makeModel(Geometry& geometry, Dice& dice) const;
    void connectControls() const;

    std::filesystem::path folder_;
    std::string name_;
    Wish wish_;
    const Scene* before_;
    std::vector<Geometry> all_;
};

double diagonal(const HPointArray& points);
/// The largest distance of two points with the same number along an axis; infinite when there are not as many, or one
/// is no number.
double largestDistance(const HPointArray& a, const HPointArray& b);
double meanDistance(const HPointArray& a, const HPointArray& b);

} // namespace parity
