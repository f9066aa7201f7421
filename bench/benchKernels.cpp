// SPDX-License-Identifier: Apache-2.0
// bench_kernels: every OpenCL kernel on the first device, launched and waited for, beside the library's own code on the
// same data and beside a kernel that only copies. See Report::legend for the columns.
#include "frame/deltas.h"
#include "harness.h"
#include "kernelBytes.h"
#include "options.h"
#include "plugin/kernels/OpenCl.h"
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/parallelFor.h"

#include <exception>
#include <string>
#include <thread>
#include <utility>

namespace {

using bench::Phase;
using kernels::Arguments;
using kernels::Buffer;
using kernels::Device;
using Points = std::vector<quill::val3<float>>;

constexpr std::uint32_t shapeCount = 50;
constexpr std::size_t passes = 10;
constexpr float envelope = 0.5F;

// What the processor's code runs on.
struct Subject {
    std::size_t n;
    Points points, result, smoothed, scratch, deltas, rest;
    quill::IndexMapper map;
    std::vector<std::uint32_t> list;
    quill::VertexConnections connections;
    quill::VertexFrames frames;
    std::vector<float> weights, coefficients, basis;
    neuralWarp::PrincipalBasis blocks;
    neuralWarp::Points unused;
    std::vector<quill::mat4d> restFramesInverse;

    explicit Subject(std::size_t side)
        : n(side * side)
        , result(n)
        , scratch(n)
        , coefficients(shapeCount, 0.01F)
        , basis(3 * n * shapeCount, 0.5F) {
        blocks.assign(basis, shapeCount);
        const ZooMesh grid = makeGrid(side - 1, side - 1);
        points = smoothed = rest = grid.points;
        for (std::size_t i = 0; i < n; ++i)
            list.push_back(static_cast<std::uint32_t>(i));
        map.setIdentity(n);
        connections.build(grid.topology(), map, 0, false);
        frames.build(grid.topology(), map, &points);
        connections.calculateConnectionWeights(weights, points, 1.0, 0.0);
        frames.calculateFrames(restFramesInverse, points, map, true, nullptr);
        deltas.assign(n, {0.01F, 0.02F, 0.03F});
    }
};

const char* const copySource = "kernel void copy(global float* to, global const float* from, uint count) {"
                               "  const uint i = get_global_id(0);"
                               "  if (i < count) vstore3(vload3(i, from), i, to);"
                               "}";

// The same on the device.
struct OnDevice {
    const Device& device;
    kernels::Program gather{device, "quillBuffers.cl", false}, smooth{device, "quillUtils.cl", true},
        deformer{device, "neuralWarpGPUNode.cl", true};
    kernels::Program copy = kernels::Program::fromText(device, "copy", copySource);
    Buffer points, result, smoothed, other, deltas, rest, map, indexer, connections, weights, framesIndexer,
        framesPairs, restFramesInverse, coefficients, basis;

    OnDevice(const Device& deviceIn, const Subject& s)
        : device(deviceIn)
        , points(device, s.points)
        , result(device, s.points)
        , smoothed(device, s.points)
        , other(device, s.points)
        , deltas(device, s.deltas)
        , rest(device, s.rest)
        , map(device, s.list)
        , indexer(device, s.connections.connectionsIndexer())
        , connections(device, s.connections.connections())
        , weights(device, s.weights)
        , framesIndexer(device, s.frames.framesIndexer())
        , framesPairs(device, s.frames.framesPairs())
        , restFramesInverse(device, s.restFramesInverse)
        , coefficients(device, s.coefficients)
        , basis(device, s.basis) {}
};

// What is measured in one row: launches one after the other, waited for at the end.
struct Row {
    Phase phase;
    std::vector<kernels::Owned<cl_kernel>> launches{};
};

Phase phaseOf(const char* name, const Subject& s, std::size_t bytes) {
    return {name, "grid", s.n, bytes};
}

kernels::Owned<cl_kernel> gather(const Subject& s, const OnDevice& d) {
    auto kernel = d.gather.kernel("copyToAffectBuffer");
    Arguments(kernel.get()).add(d.smoothed).add(d.points).add(d.map).add(static_cast<std::uint32_t>(s.n));
    return kernel;
}

kernels::Owned<cl_kernel> smoothingPass(const Subject& s, const OnDevice& d, const Buffer& to, const Buffer& from) {
    auto kernel = d.smooth.kernel("averageVertKernel");
    Arguments arguments(kernel.get());
    arguments.add(to).add(from).add(std::uint64_t{0}).add(1.0F);
    arguments.add(d.indexer).add(d.connections).add(d.weights).add(static_cast<std::uint32_t>(s.n));
    return kernel;
}

kernels::Owned<cl_kernel> principalShapes(const Subject& s, const OnDevice& d) {
    auto kernel = d.deformer.kernel("gpu_principal_shapes_kernel");
    Arguments arguments(kernel.get());
    arguments.add(d.deltas).add(d.coefficients).add(d.basis).add(shapeCount).add(static_cast<std::uint32_t>(s.n));
    return kernel;
}

kernels::Owned<cl_kernel> apply(const Subject& s, const OnDevice& d, bool surface) {
    auto kernel = d.deformer.kernel("gpu_apply_deltas_kernel");
    const auto n = static_cast<std::uint32_t>(s.n);
    Arguments arguments(kernel.get());
    arguments.add(d.result).add(d.points).add(d.smoothed).add(nullptr).add(nullptr).add(envelope);
    arguments.add(d.deltas).add(nullptr).add(n);
    for (const Buffer* buffer : {&d.framesIndexer, &d.framesPairs, &d.rest, &d.restFramesInverse})
        arguments.add(surface ? buffer : nullptr);
    arguments.add(nullptr).add(0.0F).add(n);
    return kernel;
}

Row copying(Subject& s, OnDevice& d) {
    Row row{phaseOf("copy", s, bench::bytesOf(2 * s.n, 0))};
    row.launches.push_back(d.copy.kernel("copy"));
    Arguments(row.launches[0].get()).add(d.result).add(d.points).add(static_cast<std::uint32_t>(s.n));
    row.phase.plain = [&s] { quill::parallelFor(s.n, [&](std::size_t i) { s.result[i] = s.points[i]; }); };
    return row;
}

Row gathering(Subject& s, OnDevice& d) {
    Row row{phaseOf("gather", s, bench::bytesOf(2 * s.n, s.n))};
    row.launches.push_back(gather(s, d));
    row.phase.plain = [&s] { quill::parallelFor(s.n, [&](std::size_t i) { s.result[i] = s.points[s.list[i]]; }); };
    return row;
}

void smooth(Subject& s) {
    s.connections.mushArray(s.smoothed, s.scratch, passes, 1.0F, nullptr, &s.weights, false);
}

Row smoothing(Subject& s, OnDevice& d) {
    Row row{phaseOf("smoothing pass", s, bench::smoothingBytes(s.n, s.weights.size()))};
    row.phase.perCall = passes;
    for (std::size_t pass = 0; pass < passes; ++pass)
        row.launches.push_back(smoothingPass(s, d, pass % 2 ? d.smoothed : d.other, pass % 2 ? d.other : d.smoothed));
    row.phase.plain = [&s] { smooth(s); };
    return row;
}

void extract(Subject& s) {
    neuralWarp::extractPrincipalDeltas(s.deltas, s.coefficients, s.blocks, neuralWarp::DrivenVertices(s.n), {},
                                       s.unused);
}

Row shapes(Subject& s, OnDevice& d) {
    Row row{phaseOf("principal 50", s, bench::shapesBytes(s.n, shapeCount))};
    row.launches.push_back(principalShapes(s, d));
    row.phase.plain = [&s] { extract(s); };
    return row;
}

// By the library, and a blend in single precision as the kernel's.
void applyOnProcessor(Subject& s, bool surface) {
    if (surface)
        s.frames.transportDeltas(s.scratch, s.deltas, s.rest, s.restFramesInverse, s.smoothed, nullptr);
    else
        quill::parallelFor(s.n, [&](std::size_t i) { s.scratch[i] = s.smoothed[i] + s.deltas[i]; });
    quill::parallelFor(s.n, [&](std::size_t i) {
        const auto p = s.points[i];
        s.result[i] = p + envelope * (s.scratch[i] - p);
    });
}

Row applying(Subject& s, OnDevice& d, bool surface) {
    const std::size_t bytes =
        surface ? bench::surfaceBytes(s.n, s.frames.framesPairs().size()) : bench::offsetBytes(s.n);
    Row row{phaseOf(surface ? "apply surface" : "apply offset", s, bytes)};
    row.launches.push_back(apply(s, d, surface));
    row.phase.plain = [&s, surface] { applyOnProcessor(s, surface); };
    return row;
}

// All that one frame launches in surface mode with shapes and smoothing.
Row wholeFrame(Subject& s, OnDevice& d) {
    Row row{phaseOf("frame", s, 0)};
    row.launches = smoothing(s, d).launches;
    row.launches.insert(row.launches.begin(), gather(s, d));
    row.launches.push_back(principalShapes(s, d));
    row.launches.push_back(apply(s, d, true));
    row.phase.plain = [&s] {
        quill::parallelFor(s.n, [&](std::size_t i) { s.smoothed[i] = s.points[s.list[i]]; });
        smooth(s);
        extract(s);
        applyOnProcessor(s, true);
    };
    return row;
}

void runSize(const Device& device, std::size_t side, const bench::Options& options, bench::Report& report) {
    Subject s(side);
    OnDevice d(device, s);
    const Row rows[] = {copying(s, d),         gathering(s, d),      smoothing(s, d), shapes(s, d),
                        applying(s, d, false), applying(s, d, true), wholeFrame(s, d)};
    for (const Row& row : rows)
        for (const std::size_t local : {64U, 128U, 256U}) {
            Phase phase = row.phase;
            phase.name += "/" + std::to_string(local);
            if (!options.wants(phase.name) || (options.isQuick && local != 64))
                continue;
            phase.ours = [&, local] {
                for (const auto& kernel : row.launches)
                    kernels::enqueue(device, kernel.get(), s.n, local);
                kernels::finish(device);
            };
            report.add(bench::measure(phase, std::thread::hardware_concurrency(), options.seconds));
        }
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    try {
        const auto device = Device::first();
        if (!device) {
            std::fputs("bench_kernels: there is no OpenCL device: nothing is measured\n", stderr);
            return 0;
        }
        bench::Report report(options->csv.get());
        report.header();
        for (const std::size_t side : {100U, 316U, 1000U})
            if (!options->isQuick || side < 1000)
                runSize(*device, side, *options, report);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_kernels: %s\n", error.what());
        return 1;
    }
    bench::Report::legend("the library's own code for the processor (for copy and gather: a plain loop)");
    std::puts("frame: gathering, 10 smoothing passes, the principal shapes and the surface mode, in one go");
    std::puts("A phase is KERNEL/LOCAL SIZE. Times are from a launch until it is waited for.");
    std::printf("CSV: %s\n", options->csvPath.c_str());
    return 0;
}
