// SPDX-License-Identifier: Apache-2.0
// Messages, fields and numbers of kinds are those of onnx.proto (github.com/onnx/onnx, onnx/onnx.proto).
#include "nw_model/OnnxGraph.h"

#include "Wire.h"
#include "nw_model/ModelSession.h"

#include <algorithm>
#include <array>
#include <bit>
#include <fstream>
#include <limits>
#include <optional>
#include <set>
#include <stdexcept>
#include <utility>

namespace neuralWarp {
namespace {

using Form = Wire::Form;
using Field = Wire::Field;

constexpr std::uint64_t floatType = 1; // TensorProto.DataType.FLOAT

/// TensorProto.DataType, by its numbers.
constexpr std::array<std::string_view, 17> typeNames{
    "unknown", "float32", "uint8",   "int8",   "uint16", "int16",     "int32",      "int64",   "text",
    "bool",    "float16", "float64", "uint32", "uint64", "complex64", "complex128", "bfloat16"};

/// AttributeProto.AttributeType, as far as it is told apart.
enum class AttributeKind : std::uint64_t { number = 1, integer = 2, tensor = 4, numbers = 6 };

// --- messages as they are in the file; what they mean is said when they are whole, as fields come in any order ---

struct TensorMessage {
    std::string name;
    std::vector<std::uint64_t> shape;
    std::uint64_t type = 0;
    std::vector<float> raw;
    std::vector<float> numbers;
    bool hasRaw = false;
    bool isOddRaw = false; // no whole number of floats
    bool isElsewhere = false;
    bool isSegment = false;
};

struct AttributeMessage {
    std::string name;
    std::uint64_t kind = 0;
    float number = 0.0F;
    std::int64_t integer = 0;
    TensorMessage tensor;
    std::vector<float> numbers;
};

struct NodeMessage {
    OnnxNode node;
    std::string domain;
    std::vector<OnnxConstant> constants; // of its attributes
};

struct ValueMessage {
    std::string name;
    std::uint64_t type = 0; // of a tensor; 0 for anything else
    bool hasShape = false;
    std::vector<std::int64_t> shape; // -1 for a dimension that the file does not know
};

float floatOf(std::uint64_t bits) {
    return std::bit_cast<float>(static_cast<std::uint32_t>(bits));
}

/// Product of the dimensions; nothing beyond `limit`.
template <class Number>
std::optional<std::size_t> productOf(const std::vector<Number>& shape, std::size_t limit) {
    std::size_t product = 1;
    for (const Number dimension : shape) {
        const auto size = static_cast<std::uint64_t>(dimension);
        if (size != 0 && product > limit / size)
            return {};
        product *= static_cast<std::size_t>(size);
    }
    return product;
}

std::string flawOf(const TensorMessage& tensor) {
    if (tensor.isElsewhere)
        return "lies in another file, which is not read";
    if (tensor.isSegment)
        return "is a part of a larger one";
    if (tensor.type != floatType)
        return "is of " + std::string(typeNames[tensor.type < typeNames.size() ? tensor.type : 0]) +
               " numbers and not of float32";
    if (tensor.isOddRaw || (tensor.hasRaw && !tensor.numbers.empty()))
        return "is damaged";
    const std::size_t count = tensor.raw.size() + tensor.numbers.size();
    if (productOf(tensor.shape, std::numeric_limits<std::size_t>::max()) != count)
        return "has " + std::to_string(count) + " numbers, which are not those of its shape";
    return "";
}

OnnxConstant constantOf(TensorMessage&& tensor) {
    OnnxConstant constant{std::move(tensor.name), {tensor.shape.begin(), tensor.shape.end()}, {}, flawOf(tensor)};
    if (constant.flaw.empty())
        constant.values = std::move(tensor.hasRaw ? tensor.raw : tensor.numbers);
    return constant;
}

/// The number that a Constant node gives by an attribute.
OnnxConstant constantOf(AttributeMessage&& attribute) {
    switch (static_cast<AttributeKind>(attribute.kind)) {
    case AttributeKind::tensor:
        return constantOf(std::move(attribute.tensor));
    case AttributeKind::number:
        return {"", {}, {attribute.number}, ""};
    case AttributeKind::numbers:
        return {"", {attribute.numbers.size()}, std::move(attribute.numbers), ""};
    default:
        return {"", {}, {}, "is not of float32 numbers"};
    }
}

class Reader {
public:
    explicit Reader(Wire& wire)
        : wire_(wire) {}

    OnnxGraph run() {
        message(wire_.size(), &Reader::ofModel, graph_);
        setInput();
        setOutput();
        return std::move(graph_);
    }

private:
    /// Reads the fields of a message of `length` bytes into `target`; `take` says whether a field was for it, and has
    /// then read its bytes.
    template <class Target>
    bool message(std::uint64_t length, bool (Reader::*take)(const Field&, Target&), Target& target) {
        const std::uint64_t end = wire_.position() + length;
        while (wire_.position() < end) {
            const Field field = wire_.field(end);
            if (!(this->*take)(field, target) && field.form == Form::bytes)
                wire_.skip(field.value);
        }
        if (wire_.position() != end)
            Wire::throwTruncated();
        return true;
    }

    bool ofModel(const Field& field, OnnxGraph& graph) {
        if (field.number == 25)
            throw std::runtime_error("the network defines operators of its own");
        return field.is(7, Form::bytes) && message(field.value, &Reader::ofGraph, graph);
    }

    bool ofGraph(const Field& field, OnnxGraph& graph) {
        switch (field.form == Form::bytes ? field.number : 0) {
        case 1:
            return node(field.value);
        case 5:
            graph.constants.push_back(constantOf(part<TensorMessage>(field.value, &Reader::ofTensor)));
            return true;
        case 11:
            inputs_.push_back(part<ValueMessage>(field.value, &Reader::ofValue));
            return true;
        case 12:
            outputs_.push_back(part<ValueMessage>(field.value, &Reader::ofValue));
            return true;
        case 15:
            throw std::runtime_error("the network has weights in sparse form");
        default:
            return false;
        }
    }

    bool node(std::uint64_t length) {
        auto [node, domain, constants] = part<NodeMessage>(length, &Reader::ofNode);
        if (!domain.empty() && domain != "ai.onnx")
            node.operation = domain + "." + node.operation;
        if (node.operation == "Constant" && constants.size() == 1 && node.outputs.size() == 1) {
            graph_.constants.push_back(std::move(constants.front()));
            graph_.constants.back().name = node.outputs.front();
        } else {
            graph_.nodes.push_back(std::move(node));
        }
        return true;
    }

    bool ofNode(const Field& field, NodeMessage& message) {
        switch (field.form == Form::bytes ? field.number : 0) {
        case 1:
            message.node.inputs.push_back(name(field.value));
            return true;
        case 2:
            message.node.outputs.push_back(name(field.value));
            return true;
        case 3:
            message.node.name = name(field.value);
            return true;
        case 4:
            message.node.operation = name(field.value);
            return true;
        case 5:
            attribute(part<AttributeMessage>(field.value, &Reader::ofAttribute), message);
            return true;
        case 7:
            message.domain = name(field.value);
            return true;
        default:
            return false;
        }
    }

    static void attribute(AttributeMessage&& attribute, NodeMessage& message) {
        OnnxAttribute& known = message.node.attributes.emplace_back();
        known.name = attribute.name;
        if (attribute.kind == static_cast<std::uint64_t>(AttributeKind::number))
            known.value = attribute.number;
        else if (attribute.kind == static_cast<std::uint64_t>(AttributeKind::integer))
            known.value = attribute.integer;
        message.constants.push_back(constantOf(std::move(attribute)));
    }

    bool ofAttribute(const Field& field, AttributeMessage& attribute) {
        if (field.is(1, Form::bytes))
            attribute.name = name(field.value);
        else if (field.is(2, Form::fixed32))
            attribute.number = floatOf(field.value);
        else if (field.is(3, Form::varint))
            attribute.integer = static_cast<std::int64_t>(field.value);
        else if (field.is(5, Form::bytes))
            return message(field.value, &Reader::ofTensor, attribute.tensor);
        else if (field.number == 7)
            return numbers(field, attribute.numbers);
        else if (field.is(20, Form::varint))
            attribute.kind = field.value;
        else
            return false;
        return true;
    }

    bool ofTensor(const Field& field, TensorMessage& tensor) {
        if (field.number == 1)
            return dimensions(field, tensor.shape);
        if (field.number == 4)
            return numbers(field, tensor.numbers);
        if (field.is(2, Form::varint))
            tensor.type = field.value;
        else if (field.is(8, Form::bytes))
            tensor.name = name(field.value);
        else if (field.is(9, Form::bytes))
            raw(field.value, tensor);
        else if (field.is(14, Form::varint))
            tensor.isElsewhere = field.value != 0;
        else {
            tensor.isSegment = tensor.isSegment || field.number == 3;
            return false;
        }
        return true;
    }

    bool ofValue(const Field& field, ValueMessage& value) {
        if (field.is(1, Form::bytes))
            value.name = name(field.value);
        return field.is(1, Form::bytes) || (field.is(2, Form::bytes) && message(field.value, &Reader::ofType, value));
    }

    bool ofType(const Field& field, ValueMessage& value) {
        return field.is(1, Form::bytes) && message(field.value, &Reader::ofTensorType, value);
    }

    bool ofTensorType(const Field& field, ValueMessage& value) {
        if (field.is(1, Form::varint))
            value.type = field.value;
        value.hasShape = value.hasShape || field.number == 2;
        return field.is(2, Form::bytes) && message(field.value, &Reader::ofShape, value);
    }

    bool ofShape(const Field& field, ValueMessage& value) {
        if (!field.is(1, Form::bytes))
            return false;
        count();
        return message(field.value, &Reader::ofDimension, value.shape.emplace_back(-1));
    }

    bool ofDimension(const Field& field, std::int64_t& dimension) {
        if (field.is(1, Form::varint))
            dimension = static_cast<std::int64_t>(field.value);
        return false;
    }

    // --- what fields hold ---

    template <class Target>
    Target part(std::uint64_t length, bool (Reader::*take)(const Field&, Target&)) {
        count();
        Target target;
        message(length, take, target);
        return target;
    }

    std::string name(std::uint64_t length) {
        count();
        if (length > Wire::longestText)
            throw std::runtime_error("a name in it has " + std::to_string(length) + " bytes, more than the " +
                                     std::to_string(Wire::longestText) + " that are read");
        return wire_.text(length);
    }

    // of several the last counts
    void raw(std::uint64_t length, TensorMessage& tensor) {
        tensor.hasRaw = true;
        tensor.isOddRaw = length % sizeof(float) != 0;
        tensor.raw.resize(static_cast<std::size_t>(length / sizeof(float)));
        wire_.read(std::as_writable_bytes(std::span(tensor.raw)));
        wire_.skip(length % sizeof(float));
    }

    // one, or as many as there are bytes for
    bool numbers(const Field& field, std::vector<float>& numbers) {
        if (field.form == Form::fixed32)
            numbers.push_back(floatOf(field.value));
        if (field.form != Form::bytes)
            return false;
        if (field.value % sizeof(float) != 0)
            Wire::throwTruncated();
        const std::size_t before = numbers.size();
        numbers.resize(before + static_cast<std::size_t>(field.value / sizeof(float)));
        wire_.read(std::as_writable_bytes(std::span(numbers).subspan(before)));
        return true;
    }

    bool dimensions(const Field& field, std::vector<std::uint64_t>& shape) {
        if (field.form == Form::varint)
            shape.push_back(field.value);
        count();
        if (field.form != Form::bytes)
            return field.form == Form::varint;
        for (const std::uint64_t end = wire_.position() + field.value; wire_.position() < end; count())
            shape.push_back(wire_.varint());
        return true;
    }

    void count() {
        if (++parts_ > onnxPartLimit)
            throw std::runtime_error("its graph has more than " + std::to_string(onnxPartLimit) + " parts");
    }

    // --- input and output ---

    // a file of the format's first versions has its initializers among the inputs
    void setInput() {
        std::set<std::string_view> constants;
        for (const OnnxConstant& constant : graph_.constants)
            constants.insert(constant.name);
        std::erase_if(inputs_, [&](const ValueMessage& input) { return constants.contains(input.name); });
        if (inputs_.size() != 1)
            throw std::runtime_error("the network has " + std::to_string(inputs_.size()) + " inputs and not one");
        const ValueMessage& input = inputs_.front();
        if (input.type != floatType)
            throw std::runtime_error("the input is not float32");
        if (input.shape.size() != 1)
            throw std::runtime_error("the input has not one dimension");
        if (input.shape.front() < 1 || input.shape.front() > modelInputLimit)
            throw std::runtime_error("the input has an unknown, zero or too large dimension");
        graph_.input = input.name;
        graph_.inputCount = static_cast<std::size_t>(input.shape.front());
    }

    void setOutput() {
        if (outputs_.empty())
            throw std::runtime_error("the network has no output");
        const ValueMessage& output = outputs_.front();
        graph_.output = output.name;
        const auto isUnknown = [](std::int64_t dimension) { return dimension < 0; };
        if (!output.hasShape || std::any_of(output.shape.begin(), output.shape.end(), isUnknown))
            return;
        const std::optional<std::size_t> count = productOf(output.shape, std::size_t{modelOutputLimit});
        if (!count || *count == 0)
            throw std::runtime_error("the output has no values, or more than " + std::to_string(modelOutputLimit));
        graph_.outputCount = *count;
    }

    Wire& wire_;
    OnnxGraph graph_;
    std::vector<ValueMessage> inputs_;
    std::vector<ValueMessage> outputs_;
    std::size_t parts_ = 0;
};

} // namespace

OnnxGraph readOnnxGraph(std::streambuf& source, std::uint64_t size) {
    Wire wire(source, size);
    return Reader(wire).run();
}

OnnxGraph readOnnxGraph(const std::filesystem::path& path) {
    try {
        std::filebuf file;
        if (!file.open(path, std::ios::in | std::ios::binary))
            throw std::runtime_error("the file cannot be opened");
        return readOnnxGraph(file, std::filesystem::file_size(path));
    } catch (const std::exception& error) {
        throw std::runtime_error(path.string() + ": " + error.what());
    }
}

} // namespace neuralWarp
