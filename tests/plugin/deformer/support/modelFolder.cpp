// SPDX-License-Identifier: Apache-2.0
#include "plugin/deformer/support/modelFolder.h"

#include <cstring>
#include <fstream>
#include <sstream>
#include <stdexcept>

namespace {

// --- the parts of an ONNX file, in the wire format of protocol buffers; field numbers are those of onnx.proto ---

std::string varint(std::uint64_t value) {
    std::string bytes;
    for (; value >= 128; value >>= 7U)
        bytes.push_back(static_cast<char>((value & 127U) | 128U));
    bytes.push_back(static_cast<char>(value));
    return bytes;
}

std::string number(unsigned field, std::uint64_t value) {
    return varint(std::uint64_t{field} << 3U) + varint(value);
}

std::string block(unsigned field, const std::string& bytes) {
    return varint((std::uint64_t{field} << 3U) | 2U) + varint(bytes.size()) + bytes;
}

constexpr std::uint64_t floatType = 1; // TensorProto.FLOAT

std::string valueInfo(const std::string& name, std::uint64_t size) {
    const std::string shape = block(1, number(1, size));
    const std::string tensorType = number(1, floatType) + block(2, shape);
    return block(1, name) + block(2, block(1, tensorType));
}

std::string node(const char* operation, const std::vector<std::string>& inputs, const std::string& output) {
    std::string bytes;
    for (const std::string& input : inputs)
        bytes += block(1, input);
    return bytes + block(2, output) + block(4, operation);
}

std::string tensor(const std::string& name, const std::vector<std::uint64_t>& dims, const std::vector<float>& values) {
    std::string bytes;
    for (const std::uint64_t dim : dims)
        bytes += number(1, dim);
    std::string raw(values.size() * sizeof(float), '\0');
    std::memcpy(raw.data(), values.data(), raw.size());
    return bytes + number(2, floatType) + block(8, name) + block(9, raw);
}

std::string layer(const std::string& name, const std::string& from, const std::string& to, std::size_t width,
                  const std::vector<float>& weights, const std::vector<float>& bias) {
    const std::string w = name + "weights", product = name + "product", b = name + "bias";
    return block(1, node("MatMul", {from, w}, product)) + block(1, node("Add", {product, b}, to)) +
           block(5, tensor(w, {width, bias.size()}, weights)) + block(5, tensor(b, {bias.size()}, bias));
}

std::vector<float> someWeights(std::size_t count) {
    std::vector<float> weights(count);
    for (std::size_t i = 0; i < count; ++i)
        weights[i] = 0.001F * static_cast<float>(i % 101) - 0.03F;
    return weights;
}

// --- the JSON files ---

template <class Values>
void writeList(std::ostream& out, const Values& values) {
    const char* separator = "";
    for (const auto& value : values) {
        out << separator << value;
        separator = ",";
    }
}

std::string metadata(const ModelSpec& spec) {
    std::ostringstream out;
    out << "{\"deltaMode\":" << spec.deltaMode << ",\"smoothingIterations\":" << spec.smoothingIterations
        << ",\"fullCount\":" << spec.fullCount << ",\"affectCount\":" << spec.affectCount << R"(,"subsetState":")"
        << spec.subsetState << R"(","componentTagExpression":")" << spec.componentTagExpression << R"(","affectMap":[)";
    writeList(out, spec.affectMap);
    out << "]}";
    return out.str();
}

std::string principalShapes(const std::vector<std::vector<float>>& shapes) {
    std::ostringstream out;
    out.precision(9); // reads back as the same float
    out << "{\"principalShapeCount\":" << shapes.size() << ",\"vertCount\":" << shapes.front().size() / 3
        << ",\"principalShapes\":[";
    const char* separator = "";
    for (const std::vector<float>& shape : shapes) {
        out << separator << '[';
        writeList(out, shape);
        out << ']';
        separator = ",";
    }
    out << "]}";
    return out.str();
}

} // namespace

void writeFile(const std::filesystem::path& path, const std::string& bytes) {
    std::ofstream file(path, std::ios::binary);
    if (!file.write(bytes.data(), static_cast<std::streamsize>(bytes.size())).flush())
        throw std::runtime_error(path.string() + " cannot be written");
}

std::string networkBytes(const ModelSpec& spec) {
    const std::size_t outputs = spec.bias.size();
    std::string graph = block(2, "layers"), values = "controls";
    std::size_t width = spec.controls;
    for (const std::size_t next : spec.hidden) {
        const std::string name = "hidden" + std::to_string(graph.size()) + "_";
        graph += layer(name, values, name + "sum", width, someWeights(width * next), std::vector<float>(next));
        graph += block(1, node("Relu", {name + "sum"}, name + "values"));
        values = name + "values";
        width = next;
    }
    graph += layer("", values, "deltas", width,
                   spec.weights.empty() ? std::vector<float>(width * outputs) : spec.weights, spec.bias) +
             block(11, valueInfo("controls", spec.controls)) + block(12, valueInfo("deltas", outputs));
    constexpr std::uint64_t formatVersion = 7;
    constexpr std::uint64_t operatorSet = 13;
    const std::string entry = spec.options.empty() ? "" : block(14, block(1, "ort_config") + block(2, spec.options));
    return number(1, formatVersion) + block(7, graph) + block(8, number(2, operatorSet)) + entry;
}

void writeModel(const std::filesystem::path& directory, const ModelSpec& spec) {
    std::filesystem::create_directories(directory);
    writeFile(directory / "metadata.json", metadata(spec));
    writeFile(directory / "model.onnx", networkBytes(spec));
    const std::filesystem::path shapes = directory / "principal_shapes.json";
    if (spec.shapes.empty())
        std::filesystem::remove(shapes);
    else
        writeFile(shapes, principalShapes(spec.shapes));
}
