// SPDX-License-Identifier: Apache-2.0
#include "quarn/view/networkProgram.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <cstddef>
#include <initializer_list>
#include <limits>
#include <map>
#include <set>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <variant>

#include "viewer/Network.h"

namespace quarn {
namespace {

using neuralWarp::OnnxAttribute;
using neuralWarp::OnnxConstant;
using neuralWarp::OnnxGraph;
using neuralWarp::OnnxNode;
using viewer::Operation;

constexpr float infinity = std::numeric_limits<float>::infinity();

/// What a name of the graph stands for: constants, or a vector of the page.
struct Operand {
    const OnnxConstant* constant = nullptr;
    std::uint32_t vector = 0;
    bool isRow = false; ///< a vector that the graph holds as a matrix of one row
};

[[noreturn]] void refuse(const OnnxNode& node, const std::string& reason) {
    throw std::runtime_error("the operator \"" + node.operation + "\" of node \"" + node.name + "\" " + reason);
}

std::string inQuotes(std::string_view text) {
    return "\"" + std::string(text) + "\"";
}

// --- inputs and attributes of a node ---

const std::string& inputName(const OnnxNode& node, std::size_t index) {
    static const std::string none;
    return index < node.inputs.size() ? node.inputs[index] : none;
}

void checkShape(const OnnxNode& node, std::size_t leastInputs, std::size_t mostInputs,
                std::initializer_list<std::string_view> attributes = {}) {
    if (node.inputs.size() < leastInputs || node.inputs.size() > mostInputs)
        refuse(node, "has " + std::to_string(node.inputs.size()) + " inputs, which a page cannot compute");
    if (node.outputs.size() != 1)
        refuse(node, "has " + std::to_string(node.outputs.size()) + " outputs and not one");
    for (const OnnxAttribute& attribute : node.attributes)
        if (std::find(attributes.begin(), attributes.end(), attribute.name) == attributes.end())
            refuse(node, "has the attribute " + inQuotes(attribute.name) + ", of which a page knows nothing");
}

/// The value of an attribute; `otherwise` where the node has none of that name.
template <class Number>
Number attributeOf(const OnnxNode& node, std::string_view name, Number otherwise) {
    for (const OnnxAttribute& attribute : node.attributes) {
        if (attribute.name != name)
            continue;
        if (const Number* value = std::get_if<Number>(&attribute.value))
            return *value;
        refuse(node, "has the attribute " + inQuotes(name) + " of a kind that is not known");
    }
    return otherwise;
}

// --- numbers of a node ---

const std::vector<float>& numbersOf(const OnnxNode& node, const OnnxConstant& constant) {
    if (!constant.flaw.empty())
        refuse(node, "takes the constant " + inQuotes(constant.name) + ", which " + constant.flaw);
    return constant.values;
}

/// Numbers that lie along a vector: of all dimensions only the last may be more than 1.
const std::vector<float>& rowOf(const OnnxNode& node, const OnnxConstant& constant) {
    const std::vector<float>& numbers = numbersOf(node, constant);
    if (numbers.empty() || (!constant.shape.empty() && constant.shape.back() != numbers.size()))
        refuse(node, "takes the constant " + inQuotes(constant.name) + ", which is no vector");
    return numbers;
}

bool isRow(const OnnxConstant& constant) {
    return constant.shape.size() > 1;
}

/// Rows and columns, and the numbers row by row.
struct Matrix {
    std::size_t rows;
    std::size_t columns;
    std::vector<float> numbers;
};

Matrix matrixOf(const OnnxNode& node, const OnnxConstant& constant, bool isTransposed) {
    const std::vector<float>& numbers = numbersOf(node, constant);
    if (constant.shape.size() != 2 || numbers.empty())
        refuse(node, "takes the constant " + inQuotes(constant.name) + ", which is no matrix");
    const std::size_t rows = constant.shape[0];
    const std::size_t columns = constant.shape[1];
    if (!isTransposed)
        return {rows, columns, numbers};
    Matrix turned{columns, rows, std::vector<float>(numbers.size())};
    for (std::size_t i = 0; i < rows; ++i)
        for (std::size_t j = 0; j < columns; ++j)
            turned.numbers[j * rows + i] = numbers[i * columns + j];
    return turned;
}

/// The operations by which vectors are combined with each other, with constants, and constants with a vector.
struct Arithmetic {
    Operation vectors;
    Operation withConstants;
    Operation ofConstants;
};

constexpr Arithmetic sums{Operation::add, Operation::addConstants, Operation::addConstants};
constexpr Arithmetic differences{Operation::subtract, Operation::subtractConstants, Operation::subtractFromConstants};
constexpr Arithmetic products{Operation::multiply, Operation::multiplyConstants, Operation::multiplyConstants};

class Writer {
public:
    explicit Writer(const OnnxGraph& graph)
        : graph_(graph) {
        for (const OnnxConstant& constant : graph.constants)
            define(constant.name, {&constant});
        lengths_.push_back(graph.inputCount);
        define(graph.input, {});
    }

    NetworkProgram run() {
        const std::vector<bool> isNeeded = neededNodes();
        for (std::size_t i = 0; i < graph_.nodes.size(); ++i)
            if (isNeeded[i])
                add(graph_.nodes[i]);
        return whole();
    }

private:
    using Rule = void (Writer::*)(const OnnxNode&);

    static const std::map<std::string_view, Rule>& rules() {
        static const std::map<std::string_view, Rule> all{
            {"Add", &Writer::arithmetic<sums>},
            {"Clip", &Writer::clip},
            {"Gemm", &Writer::gemm},
            {"Identity", &Writer::identity},
            {"LeakyRelu", &Writer::leakyRelu},
            {"MatMul", &Writer::matMul},
            {"Max", &Writer::max},
            {"Min", &Writer::min},
            {"Mul", &Writer::arithmetic<products>},
            {"Relu", &Writer::curve<Operation::relu>},
            {"Sigmoid", &Writer::curve<Operation::sigmoid>},
            {"Sub", &Writer::arithmetic<differences>},
            {"Tanh", &Writer::curve<Operation::tanh>},
        };
        return all;
    }

    // nodes are in the order in which they can be computed
    std::vector<bool> neededNodes() const {
        std::set<std::string_view> wanted{graph_.output};
        std::vector<bool> isNeeded(graph_.nodes.size());
        for (std::size_t i = graph_.nodes.size(); i-- > 0;) {
            const OnnxNode& node = graph_.nodes[i];
            isNeeded[i] = std::any_of(node.outputs.begin(), node.outputs.end(),
                                      [&](const std::string& output) { return wanted.contains(output); });
            if (isNeeded[i])
                wanted.insert(node.inputs.begin(), node.inputs.end());
        }
        return isNeeded;
    }

    void add(const OnnxNode& node) {
        const auto rule = rules().find(node.operation);
        if (rule == rules().end())
            refuse(node, "is none that a page can compute; it computes " + known());
        (this->*rule->second)(node);
    }

    static std::string known() {
        std::string names;
        for (const auto& [name, rule] : rules())
            names += (names.empty() ? "" : ", ") + std::string(name);
        return names;
    }

    // --- operators ---

    template <const Arithmetic& how>
    void arithmetic(const OnnxNode& node) {
        checkShape(node, 2, 2);
        const Operand a = operand(node, 0);
        const Operand b = operand(node, 1);
        if (a.constant != nullptr)
            give(node, combined(node, how.ofConstants, vector(node, 1), *a.constant));
        else if (b.constant != nullptr)
            give(node, combined(node, how.withConstants, a, *b.constant));
        else
            give(node, combined(node, how.vectors, a, b));
    }

    void matMul(const OnnxNode& node) {
        checkShape(node, 2, 2);
        const Operand a = operand(node, 0);
        const Operand b = operand(node, 1);
        if (a.constant != nullptr) { // a matrix times the vector as a column
            if (b.isRow)
                refuse(node, "multiplies a matrix by one of one row, which a page cannot compute");
            return give(node, product(node, vector(node, 1), matrixOf(node, *a.constant, true)));
        }
        if (b.constant == nullptr)
            refuse(node, "multiplies two vectors, which a page cannot compute");
        give(node, product(node, a, matrixOf(node, *b.constant, false)));
    }

    /// alpha a b + beta c
    void gemm(const OnnxNode& node) {
        checkShape(node, 2, 3, {"alpha", "beta", "transA", "transB"});
        Operand result = vector(node, 0);
        if (attributeOf<std::int64_t>(node, "transA", 0) != 0 && lengths_[result.vector] != 1)
            refuse(node, "turns its vector into a column, which a page cannot compute");
        const Operand b = operand(node, 1);
        if (b.constant == nullptr)
            refuse(node, "multiplies two vectors, which a page cannot compute");
        result = product(node, result, matrixOf(node, *b.constant, attributeOf<std::int64_t>(node, "transB", 0) != 0));
        result.isRow = true;
        if (const float alpha = attributeOf(node, "alpha", 1.0F); alpha != 1.0F)
            result = scaled(result, alpha);
        const float beta = attributeOf(node, "beta", 1.0F);
        if (!inputName(node, 2).empty() && beta != 0.0F)
            result = plus(node, result, operand(node, 2), beta);
        give(node, result);
    }

    Operand plus(const OnnxNode& node, const Operand& result, Operand c, float beta) {
        const std::size_t length = lengths_[result.vector];
        if (c.constant == nullptr) {
            c = beta == 1.0F ? c : scaled(c, beta);
            c = combined(node, Operation::add, result, c);
        } else {
            OnnxConstant numbers = *c.constant;
            for (float& number : numbers.values)
                number *= beta;
            c = combined(node, Operation::addConstants, result, numbers);
        }
        if (lengths_[c.vector] != length)
            refuse(node, "adds " + std::to_string(lengths_[c.vector]) + " numbers to " + std::to_string(length));
        return c;
    }

    void clip(const OnnxNode& node) {
        checkShape(node, 1, 3, {"min", "max"}); // attributes up to version 6 of the operator
        const Operand a = vector(node, 0);
        bound(node, a, {bounds(node, 1, attributeOf(node, "min", -infinity))},
              {bounds(node, 2, attributeOf(node, "max", infinity))});
    }

    std::vector<float> bounds(const OnnxNode& node, std::size_t index, float otherwise) {
        if (inputName(node, index).empty())
            return {otherwise};
        const Operand given = operand(node, index);
        if (given.constant == nullptr)
            refuse(node, "has computed bounds, which a page does not know");
        return rowOf(node, *given.constant);
    }

    void max(const OnnxNode& node) {
        checkShape(node, 2, 2);
        const std::size_t at = boundIndex(node);
        bound(node, vector(node, 1 - at), bounds(node, at, 0.0F), {infinity});
    }

    void min(const OnnxNode& node) {
        checkShape(node, 2, 2);
        const std::size_t at = boundIndex(node);
        bound(node, vector(node, 1 - at), {-infinity}, bounds(node, at, 0.0F));
    }

    std::size_t boundIndex(const OnnxNode& node) { return operand(node, 0).constant != nullptr ? 0 : 1; }

    // one number for all, or both sides one for each value
    void bound(const OnnxNode& node, const Operand& a, std::vector<float> least, std::vector<float> most) {
        const std::size_t length = lengths_[a.vector];
        const std::size_t count = std::max(least.size(), most.size());
        for (std::vector<float>* side : {&least, &most}) {
            if (side->size() != 1 && side->size() != length)
                refuse(node, "bounds " + std::to_string(length) + " numbers by " + std::to_string(side->size()));
            if (std::any_of(side->begin(), side->end(), [](float number) { return std::isnan(number); }))
                refuse(node, "has a bound that is no number");
            side->resize(count, side->front());
        }
        least.insert(least.end(), most.begin(), most.end());
        give(node, step(Operation::clip, a, least, length));
    }

    void leakyRelu(const OnnxNode& node) {
        checkShape(node, 1, 1, {"alpha"});
        const Operand a = vector(node, 0);
        give(node, step(Operation::leakyRelu, a, {}, lengths_[a.vector], attributeOf(node, "alpha", 0.01F)));
    }

    template <Operation kind>
    void curve(const OnnxNode& node) {
        checkShape(node, 1, 1);
        const Operand a = vector(node, 0);
        give(node, step(kind, a, {}, lengths_[a.vector]));
    }

    void identity(const OnnxNode& node) {
        checkShape(node, 1, 1);
        give(node, operand(node, 0));
    }

    // --- what they are made of ---

    Operand operand(const OnnxNode& node, std::size_t index) const {
        const auto found = operands_.find(inputName(node, index));
        if (found == operands_.end())
            refuse(node, "takes " + inQuotes(inputName(node, index)) + ", which nothing before it gives");
        return found->second;
    }

    Operand vector(const OnnxNode& node, std::size_t index) const {
        const Operand found = operand(node, index);
        if (found.constant != nullptr)
            refuse(node, "computes with constants where a page needs a vector that comes from the controls");
        return found;
    }

    Operand product(const OnnxNode& node, const Operand& a, const Matrix& matrix) {
        if (matrix.rows != lengths_[a.vector])
            refuse(node, "multiplies " + std::to_string(lengths_[a.vector]) + " numbers by a matrix of " +
                             std::to_string(matrix.rows) + " rows");
        return step(Operation::matrixProduct, a, matrix.numbers, matrix.columns);
    }

    Operand combined(const OnnxNode& node, Operation kind, const Operand& a, const OnnxConstant& constant) {
        const std::vector<float>& numbers = rowOf(node, constant);
        Operand result = step(kind, a, numbers, commonLength(node, lengths_[a.vector], numbers.size()));
        result.isRow = a.isRow || isRow(constant);
        return result;
    }

    Operand combined(const OnnxNode& node, Operation kind, const Operand& a, const Operand& b) {
        Operand result = step(kind, a, {}, commonLength(node, lengths_[a.vector], lengths_[b.vector]), 0.0F, b.vector);
        result.isRow = a.isRow || b.isRow;
        return result;
    }

    static std::size_t commonLength(const OnnxNode& node, std::size_t a, std::size_t b) {
        if (a != b && a != 1 && b != 1)
            refuse(node, "combines " + std::to_string(a) + " numbers with " + std::to_string(b));
        return std::max(a, b);
    }

    Operand scaled(const Operand& a, float factor) {
        return step(Operation::multiplyConstants, a, std::array{factor}, lengths_[a.vector]);
    }

    /// Writes an operation, and makes the vector of its result.
    Operand step(Operation kind, const Operand& a, std::span<const float> constants, std::size_t length,
                 float parameter = 0.0F, std::uint32_t b = viewer::noVector) {
        const auto result = static_cast<std::uint32_t>(lengths_.size());
        const std::size_t offset = program_.constants.size();
        if (offset + constants.size() > std::numeric_limits<std::uint32_t>::max())
            throw std::runtime_error("the network has more numbers than a page can hold");
        program_.constants.insert(program_.constants.end(), constants.begin(), constants.end());
        for (const std::uint32_t word :
             {static_cast<std::uint32_t>(kind), a.vector, b, result, static_cast<std::uint32_t>(offset),
              static_cast<std::uint32_t>(constants.size()), std::bit_cast<std::uint32_t>(parameter)})
            steps_.push_back(word);
        lengths_.push_back(length);
        return {nullptr, result, a.isRow};
    }

    void give(const OnnxNode& node, const Operand& result) { define(node.outputs.front(), result); }

    void define(const std::string& name, const Operand& operand) {
        if (!operands_.emplace(name, operand).second)
            throw std::runtime_error("the name " + inQuotes(name) + " stands for two things in the network");
    }

    NetworkProgram whole() {
        const auto output = operands_.find(graph_.output);
        if (output == operands_.end() || output->second.constant != nullptr)
            throw std::runtime_error("the output " + inQuotes(graph_.output) + " does not come from the controls");
        const std::size_t count = lengths_[output->second.vector];
        if (graph_.outputCount != 0 && graph_.outputCount != count)
            throw std::runtime_error("the output has " + std::to_string(count) + " values, and is said to have " +
                                     std::to_string(graph_.outputCount));
        constexpr std::size_t wordsOfStep = 7;
        std::vector<std::size_t> words{
            1, lengths_.size(), lengths_.front(), count, steps_.size() / wordsOfStep, output->second.vector};
        words.insert(words.end(), lengths_.begin(), lengths_.end());
        for (const std::size_t word : words)
            program_.words.push_back(static_cast<std::uint32_t>(word));
        program_.words.insert(program_.words.end(), steps_.begin(), steps_.end());
        return std::move(program_);
    }

    const OnnxGraph& graph_;
    std::map<std::string, Operand> operands_;
    std::vector<std::size_t> lengths_; // of the vectors
    std::vector<std::uint32_t> steps_; // words of the operations
    NetworkProgram program_;
};

} // namespace

NetworkProgram networkProgram(const OnnxGraph& graph) {
    return Writer(graph).run();
}

} // namespace quarn
