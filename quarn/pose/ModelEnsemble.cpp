// SPDX-License-Identifier: Apache-2.0
#include "quarn/pose/ModelEnsemble.h"

#include "nw_model/PrincipalShapes.h"
#include "quarn/scene/modelFiles.h"

#include <algorithm>
#include <cmath>
#include <stdexcept>

namespace quarn {

namespace fs = std::filesystem;

namespace {

std::size_t drivenVertices(const neuralWarp::ModelMetadata& metadata) {
    return metadata.subsetState == neuralWarp::SubsetState::Partial ? metadata.affectMap.size() : metadata.fullCount;
}

// evenly spread ones of `count` vertices, ascending
std::vector<std::size_t> lookedAt(std::size_t count) {
    const std::size_t taken = std::min(count, ModelEnsemble::mostVertices);
    std::vector<std::size_t> vertices(taken);
    for (std::size_t i = 0; i < taken; ++i)
        vertices[i] = i * count / taken;
    return vertices;
}

void throwFirst(const fs::path& directory, const std::vector<std::string>& problems) {
    if (!problems.empty())
        throw std::runtime_error(directory.string() + " is damaged: " + problems.front());
}

} // namespace

struct ModelEnsemble::Member {
    fs::path directory;
    neuralWarp::ModelMetadata metadata;
    neuralWarp::ModelSession session;
    std::vector<float> shapes; ///< [shapes][3 * vertices looked at]; empty when the network gives deltas
    std::size_t outputs = 0;   ///< of the network that are needed

    explicit Member(const fs::path& model)
        : directory(model) {
        if (!fs::is_directory(directory))
            throw std::runtime_error(directory.string() + " is no model directory");
        std::vector<std::string> problems;
        readMetadata(directory, metadata, problems);
        throwFirst(directory, problems);
        if (drivenVertices(metadata) == 0)
            throw std::runtime_error(directory.string() + " moves no vertex");
        session.load(directory / "model.onnx", true);
        if (!session.isLoaded())
            throw std::runtime_error(directory.string() + " has no network that can be used: " + session.errorText());
        readShapes();
    }

    std::size_t inputs() const { return static_cast<std::size_t>(session.inputCount()); }

    // the deltas of the vertices that are looked at
    void deltas(std::span<const float> controls, const std::vector<std::size_t>& vertices, std::span<float> xyz) {
        const std::vector<float> values = session.run(controls);
        if (values.size() < outputs)
            throw std::runtime_error(directory.string() + " gives " + std::to_string(values.size()) +
                                     " values, and its vertices need " + std::to_string(outputs) + ". " +
                                     session.errorText());
        if (shapes.empty())
            for (std::size_t i = 0; i < xyz.size(); ++i)
                xyz[i] = values[3 * vertices[i / 3] + i % 3];
        else
            mix(values, xyz);
        if (std::any_of(xyz.begin(), xyz.end(), [](float value) { return !std::isfinite(value); }))
            throw std::runtime_error(directory.string() + " gives a delta that is no finite number");
    }

private:
    void mix(const std::vector<float>& weights, std::span<float> xyz) const {
        std::fill(xyz.begin(), xyz.end(), 0.0F);
        for (std::size_t shape = 0; shape < outputs; ++shape) {
            const float weight = weights[shape];
            const float* const row = shapes.data() + shape * xyz.size();
            for (std::size_t i = 0; i < xyz.size(); ++i)
                xyz[i] += weight * row[i];
        }
    }

    void readShapes() {
        const std::size_t driven = drivenVertices(metadata);
        const fs::path file = directory / "principal_shapes.json";
        std::vector<float> values; // [vertices][shapes][3]
        std::uint64_t shapeCount = 0;
        std::uint64_t vertexCount = 0;
        if (fs::exists(file) && !neuralWarp::readPrincipalShapesFile(file, values, shapeCount, vertexCount))
            throw std::runtime_error(directory.string() + " is damaged: its principal_shapes.json cannot be read");
        outputs = values.empty() ? 3 * driven : static_cast<std::size_t>(shapeCount);
        if (values.empty())
            return;
        if (vertexCount < driven)
            throw std::runtime_error(directory.string() + " is damaged: its shapes have " +
                                     std::to_string(vertexCount) + " vertices, and it moves " + std::to_string(driven));
        const std::vector<std::size_t> vertices = lookedAt(driven);
        shapes.reserve(outputs * 3 * vertices.size());
        for (std::size_t shape = 0; shape < outputs; ++shape)
            for (const std::size_t vertex : vertices) {
                const float* const xyz = values.data() + (vertex * outputs + shape) * 3;
                shapes.insert(shapes.end(), xyz, xyz + 3);
            }
    }
};

struct ModelEnsemble::Geometry {
    std::vector<std::unique_ptr<Member>> members;
    std::vector<std::size_t> vertices;   ///< that are looked at
    std::vector<std::vector<float>> xyz; ///< of each member

    explicit Geometry(std::size_t count)
        : vertices(lookedAt(count)) {}

    double disagreement(std::span<const float> controls) {
        for (std::size_t i = 0; i < members.size(); ++i)
            members[i]->deltas(controls, vertices, xyz[i]);
        double sum = 0.0;
        for (std::size_t vertex = 0; vertex < vertices.size(); ++vertex)
            sum += deviation(vertex);
        return sum / static_cast<double>(vertices.size());
    }

private:
    double deviation(std::size_t vertex) const {
        const auto count = static_cast<double>(members.size());
        double squares = 0.0;
        for (std::size_t i = 3 * vertex; i < 3 * vertex + 3; ++i) {
            double mean = 0.0;
            for (const std::vector<float>& one : xyz)
                mean += one[i] / count;
            for (const std::vector<float>& one : xyz)
                squares += (one[i] - mean) * (one[i] - mean);
        }
        return std::sqrt(squares / (count - 1.0));
    }
};

ModelEnsemble::ModelEnsemble(const std::vector<fs::path>& directories) {
    for (const fs::path& directory : directories)
        add(directory);
    for (const Geometry& geometry : geometries_)
        if (geometry.members.size() < 2) {
            const Member& only = *geometry.members.front();
            throw std::runtime_error(only.directory.string() + " is the only model of \"" + only.metadata.geometry +
                                     "\": what to learn next is where two or more disagree that were trained with "
                                     "different seeds");
        }
}

ModelEnsemble::~ModelEnsemble() = default;

void ModelEnsemble::add(const fs::path& directory) {
    auto member = std::make_unique<Member>(directory);
    auto place = std::find_if(geometries_.begin(), geometries_.end(), [&](const Geometry& geometry) {
        return geometry.members.front()->metadata.geometry == member->metadata.geometry;
    });
    if (place == geometries_.end())
        place = geometries_.insert(place, Geometry(drivenVertices(member->metadata)));
    else if (const neuralWarp::ModelMetadata& first = place->members.front()->metadata;
             drivenVertices(first) != drivenVertices(member->metadata) ||
             first.affectMap != member->metadata.affectMap || first.deltaMode != member->metadata.deltaMode)
        throw std::runtime_error(directory.string() + " and " + place->members.front()->directory.string() +
                                 " do not move the same vertices in the same delta mode, and cannot be compared");
    place->xyz.emplace_back(3 * place->vertices.size());
    place->members.push_back(std::move(member));
}

void ModelEnsemble::requireControls(std::size_t controls) const {
    for (const Geometry& geometry : geometries_)
        for (const auto& member : geometry.members)
            if (member->inputs() > controls)
                throw std::runtime_error(member->directory.string() + " takes " + std::to_string(member->inputs()) +
                                         " control values, and the deformer has " + std::to_string(controls));
}

double ModelEnsemble::disagreement(std::span<const float> controls) {
    double largest = 0.0;
    for (Geometry& geometry : geometries_)
        largest = std::max(largest, geometry.disagreement(controls));
    return largest;
}

} // namespace quarn
