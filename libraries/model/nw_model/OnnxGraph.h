// SPDX-License-Identifier: Apache-2.0
// neuralWarp model runtime: what a network file says is computed, for those who compute it without the runtime.
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <streambuf>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

namespace neuralWarp {

/// Numbers that a network is made of: an initializer, or the output of a Constant node.
struct OnnxConstant {
    std::string name;
    std::vector<std::size_t> shape; ///< none for a scalar
    std::vector<float> values;      ///< as many as the shape says, row-major; finite or not
    std::string flaw;               ///< why there are no values, as "is of int64 numbers and not of float32"; else ""
};

struct OnnxAttribute {
    std::string name;
    std::variant<std::monostate, float, std::int64_t> value; ///< nothing for any other kind, as texts or graphs
};

struct OnnxNode {
    std::string name;      ///< may be empty, and need not be unique
    std::string operation; ///< with its domain in front where that is not the standard's own: "com.example.Warp"
    std::vector<std::string> inputs;  ///< names of values before it; "" for one that is left out
    std::vector<std::string> outputs; ///< as inputs
    std::vector<OnnxAttribute> attributes;
};

/// The graph of a network that ModelSession can run: one input, float32 [inputCount], and at least one output. Nothing
/// of it is checked but what is said here: names may be unknown or there twice.
struct OnnxGraph {
    std::vector<OnnxNode> nodes; ///< in the file's order, without Constant nodes of numbers: they are constants
    std::vector<OnnxConstant> constants;
    std::string input;
    std::size_t inputCount = 0;  ///< 1 to modelInputLimit
    std::string output;          ///< the first
    std::size_t outputCount = 0; ///< 1 to modelOutputLimit; 0 when the file leaves it to whoever computes
};

/// Parts of a graph that are read at most: nodes, names, attributes and dimensions. A hundred hidden layers have 1,500.
inline constexpr std::size_t onnxPartLimit = 100'000;

/// Reads the graph of an ONNX file. Throws std::runtime_error, with the path and what is wrong, when the file cannot be
/// read, is damaged, has another number of inputs or others than said above, weights in sparse form, operators of its
/// own, more than onnxPartLimit parts or a name of more than 512 bytes. No file makes it take much more memory than the
/// file is long. Thread: any.
OnnxGraph readOnnxGraph(const std::filesystem::path& path);

/// The same of `size` bytes of a source; errors are without a path.
OnnxGraph readOnnxGraph(std::streambuf& source, std::uint64_t size);

} // namespace neuralWarp
