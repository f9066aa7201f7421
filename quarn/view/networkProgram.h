// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdint>
#include <vector>

#include "nw_model/OnnxGraph.h"

namespace quarn {

/// A network as viewer::Network computes it.
struct NetworkProgram {
    std::vector<std::uint32_t> words; ///< in the form that viewer/Network.h says
    std::vector<float> constants;
};

/// What a page computes for the first output of a graph; nodes that only others need are left out.
///
/// A page computes on one vector: MatMul and Gemm with a matrix of constants, Add, Sub and Mul of two values or of one
/// and constants, Clip, and Max and Min with constants, which are its two halves, LeakyRelu, Relu, Tanh, Sigmoid, and
/// Identity. Throws std::runtime_error, which names the operator and the node, for any other; for one of these with an
/// attribute, a length or another input that a page knows nothing of; and when the output does not come from the input.
NetworkProgram networkProgram(const neuralWarp::OnnxGraph& graph);

} // namespace quarn
