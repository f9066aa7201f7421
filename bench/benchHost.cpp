// SPDX-License-Identifier: Apache-2.0
// bench_host: what it costs the host to take a mesh through a chain of deformers. Each of them reads all positions and
// sets them again, by an array of its own or from where they lie to where they go; the yardstick ("plain") is the same
// copy of the positions, by a plain loop over the same layouts. A unit of work is one deformer. With arrays and a
// million vertices the ratio should stay below 1.5; the plain copy without one finds its two buffers in the cache.
#include "harness.h"
#include "options.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnMeshData.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HPxDeformerNode.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Plugins.h"
#include "openquarn_app/Session.h"

#include <algorithm>
#include <array>
#include <exception>
#include <memory>
#include <stdexcept>
#include <string>
#include <tuple>
#include <vector>

namespace {

using bench::Phase;

constexpr std::size_t deformers = 4;

void check(const HStatus& status) {
    if (status.error())
        throw std::runtime_error(status.errorString().asStdString());
}

/// How a deformer reads and sets positions: by an array that is kept from one evaluation to the next, by a new one, or
/// by none.
enum class Way { keptArray, newArray, raw };
Way way = Way::keptArray;

class PassThrough : public HPxDeformerNode {
public:
    static HPxNode* creator() { return new PassThrough; }

    HStatus deform(HDataBlock&, HItGeometry& iterator, const HMatrix&, unsigned) override {
        if (way == Way::raw) {
            const double* const from = iterator.rawPositions();
            std::copy_n(from, std::size_t{3} * iterator.count(), iterator.rawPositionsToSet());
            return HStatus::kSuccess;
        }
        HPointArray own;
        HPointArray& points = way == Way::keptArray ? kept_ : own;
        const HStatus status = iterator.allPositions(points);
        return status.error() ? status : iterator.setAllPositions(points);
    }

private:
    HPointArray kept_;
};

constexpr unsigned typeId = 0x7e570111;

HStatus initializePlugin(HObject object) {
    return HFnPlugin(object).registerNode("passThrough", typeId, PassThrough::creator, nullptr, HPxNode::kDeformerNode);
}
HStatus uninitializePlugin(HObject object) {
    return HFnPlugin(object).deregisterNode(typeId);
}

HObject gridMesh(unsigned side, double depth) {
    HPointArray points(side * side);
    HIntArray counts, connects;
    check(counts.reserve(std::size_t{side} * side));
    check(connects.reserve(std::size_t{4} * side * side));
    for (unsigned i = 0; i < points.length(); ++i) {
        const unsigned column = i % side, row = i / side;
        points[i] = HPoint(column, row, depth);
        if (column + 1 == side || row + 1 == side)
            continue;
        counts.append(4);
        for (const unsigned vertex : {i, i + 1, i + side + 1, i + side})
            connects.append(static_cast<int>(vertex));
    }
    HStatus status;
    HObject mesh = HFnMeshData().create(points, counts, connects, &status);
    check(status);
    return mesh;
}

HPlug inputOf(const HObject& deformer) {
    return HPlug(deformer, HPxGeometryFilter::input).elementByLogicalIndex(0).child(HPxGeometryFilter::inputGeometry);
}
HPlug outputOf(const HObject& deformer) {
    return HPlug(deformer, HPxGeometryFilter::outputGeom).elementByLogicalIndex(0);
}

/// A chain whose input alternates between two meshes.
class Chain {
public:
    explicit Chain(unsigned side)
        : meshes_{gridMesh(side, 0.0), gridMesh(side, 1.0)} {
        HDGModifier modifier;
        for (std::size_t i = 0; i < deformers; ++i) {
            nodes_.push_back(HFnDependencyNode().create("passThrough"));
            if (i > 0)
                check(modifier.connect(outputOf(nodes_[i - 1]), inputOf(nodes_[i])));
        }
        check(modifier.doIt());
    }

    void evaluate() {
        check(inputOf(nodes_.front()).setHObject(meshes_.at(++frame_ % 2)));
        check(OpenQuarn::evaluate(outputOf(nodes_.back())));
    }

private:
    std::array<HObject, 2> meshes_;
    std::vector<HObject> nodes_;
    std::size_t frame_ = 0;
};

/// Positions as the host stores them, and a copy of them in and out for each deformer.
class PlainCopy {
public:
    explicit PlainCopy(std::size_t vertices)
        : vertices_(vertices)
        , buffers_{std::vector<double>(3 * vertices, 1.0), std::vector<double>(3 * vertices, 2.0)} {}

    void run() {
        for (std::size_t i = 0; i < deformers; ++i)
            copy(buffers_.at(i % 2), buffers_.at((i + 1) % 2));
    }

private:
    void copy(const std::vector<double>& from, std::vector<double>& to) {
        if (way == Way::raw) {
            std::copy(from.begin(), from.end(), to.begin());
            return;
        }
        HPointArray own;
        HPointArray& points = way == Way::keptArray ? kept_ : own;
        check(points.setLength(vertices_));
        for (std::size_t i = 0; i < vertices_; ++i)
            points[i] = HPoint(from[3 * i], from[3 * i + 1], from[3 * i + 2]);
        for (std::size_t i = 0; i < vertices_; ++i) {
            to[3 * i] = points[i].x;
            to[3 * i + 1] = points[i].y;
            to[3 * i + 2] = points[i].z;
        }
    }

    std::size_t vertices_;
    std::array<std::vector<double>, 2> buffers_;
    HPointArray kept_;
};

void runAll(const bench::Options& options, bench::Report& report) {
    for (const unsigned side : {100U, 1000U}) {
        const auto chain = std::make_shared<Chain>(side);
        const std::size_t vertices = std::size_t{side} * side;
        const auto plain = std::make_shared<PlainCopy>(vertices);
        for (const auto& [name, how, doubles] : {std::tuple{"pass through, kept array", Way::keptArray, 3 + 4 + 4 + 3},
                                                 {"pass through, new array", Way::newArray, 3 + 4 + 4 + 3},
                                                 {"pass through, raw", Way::raw, 3 + 3}}) {
            Phase phase{name, std::to_string(side) + " x " + std::to_string(side), vertices};
            phase.bytes = vertices * static_cast<std::size_t>(doubles) * sizeof(double);
            phase.perCall = deformers;
            phase.parallel = false;
            phase.ours = [chain] { chain->evaluate(); };
            phase.plain = [plain] { plain->run(); };
            way = how;
            if (phase.name.rfind(options.only, 0) == 0)
                report.add(bench::measure(phase, 1, options.seconds));
        }
    }
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    try {
        const OpenQuarn::Session session;
        OpenQuarn::addPlugin("bench", initializePlugin, uninitializePlugin);
        bench::Report report(options->csv.get());
        report.header();
        runAll(*options, report);
        bench::Report::legend("a copy of the positions, in and out of an array or raw");
        std::printf("CSV: %s\n", options->csvPath.c_str());
        return 0;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_host: %s\n", error.what());
        return 1;
    }
}
