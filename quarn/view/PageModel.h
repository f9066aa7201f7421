// SPDX-License-Identifier: Apache-2.0
// The model of a page: what the deformer takes of a model directory, as the page's core takes it.
#pragma once

#include "nw_deform/Model.h"
#include "quarn/view/networkProgram.h"
#include "quarn/view/packing.h"

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quarn {

struct PageModel {
    std::shared_ptr<const neuralWarp::Model> model;
    std::string name;
    std::uint64_t networkBytes = 0;    ///< of the network's file
    std::string trainer;               ///< that it says it comes from; may be empty
    std::optional<std::uint64_t> seed; ///< the same
    NetworkProgram network;
    std::size_t slots = 0, shapes = 0;   ///< shapes 0: the network gives the deltas themselves
    std::vector<std::uint32_t> vertices; ///< [slots] the vertex of each; empty: its own number
    std::vector<float> values;           ///< [slots][shapes][3] the basis as the deformer has it
    PackedBasis basis;                   ///< the same as the page has it
};

/// Reads a model for a mesh of `vertexCount` vertices. Throws std::runtime_error or std::invalid_argument, which name
/// the file or the operator and the reason.
PageModel readPageModel(const std::filesystem::path& directory, std::size_t vertexCount, BasisKind kind);

/// What packing the basis costs in frames of these controls [frames][controls], in the scene's unit; 0 without a basis.
/// Throws std::runtime_error when the network fails.
double basisErrorOf(const PageModel& model, std::span<const float> controls);

} // namespace quarn
