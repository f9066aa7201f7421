// SPDX-License-Identifier: Apache-2.0
// Models that were trained alike, but for their seeds: where they contradict each other, they know too little.
#pragma once

#include "nw_model/ModelSession.h"

#include <filesystem>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace quarn {

/// Query by committee (Seung, Opper and Sompolinsky 1992) for a regression: what a pose would teach is taken to be how
/// far the members' answers are spread. Errors are std::runtime_error that names the model. Thread: main.
class ModelEnsemble {
public:
    /// Model directories, two or more of each geometry that one of them is of. Loads them as the deformer does. Throws
    /// for one that is damaged, one of a geometry that has no other, and members that move different vertices.
    explicit ModelEnsemble(const std::vector<std::filesystem::path>& directories);
    ~ModelEnsemble();

    /// Throws for a model that takes more than `controls` values.
    void requireControls(std::size_t controls) const;

    /// How far the members are apart for these control values, as many as requireControls() has seen: at each vertex
    /// the standard deviation of their deltas, in scene units; of these the mean over the vertices of a geometry, and
    /// of several geometries the largest. Of a geometry with more than `mostVertices`, so many that are spread evenly
    /// over it are looked at. Throws where a network gives no finite numbers.
    double disagreement(std::span<const float> controls);

    static constexpr std::size_t mostVertices = 1024;

private:
    struct Member;
    struct Geometry;
    void add(const std::filesystem::path& directory);

    std::vector<Geometry> geometries_;
};

} // namespace quarn
