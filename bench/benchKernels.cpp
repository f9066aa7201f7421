// SPDX-License-Identifier: Apache-2.0
// bench_kernels: every OpenCL kernel on the first device, launched and waited for, beside the library's own code on the
// same data and beside a kernel that only copies. See Report::legend for the columns.
#include "harness.h"
#include "kernelBytes.h"
#include "kernels/OpenCl.h"
#include "neuralWarp/deltas.h"
#include "options.h"
#include "support/meshZoo.h"

#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/parallelFor.h"

#include <array>
#include <exception>
#include <string>
#include <thread>
#include <utility>

namespace {

using bench::bytesOf;
using bench::Phase;
using kernels::Arguments;
using kernels::Buffer;
using kernels::Device;
using Points = std::vector<quill::val3<float>>;

constexpr std::uint32_t shapeCount = 50;

// What the processor's code runs on.
struct Subject {
    std::size_t n;
    Points points, result, smoothed, scratch, deltas, rest;
    quill::IndexMapper map;
    std::vector<std::uint32_t> list;
    quill::VertexConnections connections;
    quill::VertexFrames frames;
    std::vector<float> weights, coefficients, basis;
    std::vector<quill::mat4d> restFramesInverse;
    neuralWarp::neuralWarpData data;

    explicit Subject(std::size_t side)
        : n(side * side)
        , result(n)
        , scratch(n)
        , coefficients(shapeCount, 0.01F)
        , basis(3 * n * shapeCount, 0.5F) {
        const ZooMesh grid = makeGrid(side - 1, side - 1);
        points = smoothed = rest = grid.points;
        for (std::size_t i = 0; i < n; ++i)
            list.push_back(static_cast<std::uint32_t>(i));
        map.setIdentity(n);
        data.componentMap.setIdentity(n);
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
        apply{device, "neuralWarpGPUNode.cl", true};
    kernels::Program copy = kernels::Program::fromText(device, "copy", copySource);
    Buffer points, result, smoothed, deltas, rest, map, indexer, connections, weights, framesIndexer, framesPairs,
        restFramesInverse, coefficients, basis;

    OnDevice(const Device& deviceIn, const Subject& s)
        : device(deviceIn)
        , points(device, s.points)
        , result(device, s.points)
        , smoothed(device, s.points)
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

// One measured kernel, ready to be launched.
struct Row {
    Phase phase;
    kernels::Owned<cl_kernel> kernel;
    std::size_t launches = 1; // in one call
};

Row copying(Subject& s, OnDevice& d) {
    Row row{{"copy", "grid", s.n, bytesOf(2 * s.n, 0)}, d.copy.kernel("copy")};
    Arguments(row.kernel.get()).add(d.result).add(d.points).add(static_cast<std::uint32_t>(s.n));
    row.phase.plain = [&s] { quill::parallelFor(s.n, [&](std::size_t i) { s.result[i] = s.points[i]; }); };
    return row;
}

Row gathering(Subject& s, OnDevice& d) {
    Row row{{"gather", "grid", s.n, bytesOf(2 * s.n, s.n)}, d.gather.kernel("copyToAffectBuffer")};
    Arguments(row.kernel.get()).add(d.result).add(d.points).add(d.map).add(static_cast<std::uint32_t>(s.n));
    row.phase.plain = [&s] { quill::parallelFor(s.n, [&](std::size_t i) { s.result[i] = s.points[s.list[i]]; }); };
    return row;
}

Row smoothing(Subject& s, OnDevice& d) {
    Row row{{"smoothing pass", "grid", s.n, bench::smoothingBytes(s.n, s.weights.size())},
            d.smooth.kernel("averageVertKernel"),
            10};
    row.phase.perCall = row.launches;
    const std::uint64_t noMask = 0;
    Arguments(row.kernel.get())
        .add(d.result)
        .add(d.smoothed)
        .add(&noMask, sizeof noMask)
        .add(1.0F)
        .add(d.indexer)
        .add(d.connections)
        .add(d.weights)
        .add(static_cast<std::uint32_t>(s.n));
    row.phase.plain = [&s] { s.connections.mushArray(s.smoothed, s.scratch, 10, 1.0F, nullptr, &s.weights, false); };
    return row;
}

Row shapes(Subject& s, OnDevice& d) {
    Row row{{"principal 50", "grid", s.n, bench::shapesBytes(s.n, shapeCount)},
            d.apply.kernel("gpu_principal_shapes_kernel")};
    Arguments(row.kernel.get())
        .add(d.deltas)
        .add(d.coefficients)
        .add(d.basis)
        .add(shapeCount)
        .add(static_cast<std::uint32_t>(s.n));
    row.phase.plain = [&s] {
        neuralWarp::extractPrincipalDeltas(s.deltas, s.coefficients, shapeCount, s.basis,
                                           neuralWarp::DrivenVertices(s.data));
    };
    return row;
}

// The processor blends as the kernel does: in single precision.
void blend(Subject& s) {
    quill::parallelFor(s.n, [&](std::size_t i) {
        const auto p = s.points[i];
        s.result[i] = p + 0.5F * (s.scratch[i] - p);
    });
}

Row applying(Subject& s, OnDevice& d, bool surface) {
    const std::size_t bytes =
        surface ? bench::surfaceBytes(s.n, s.frames.framesPairs().size()) : bench::offsetBytes(s.n);
    Row row{{surface ? "apply surface" : "apply offset", "grid", s.n, bytes},
            d.apply.kernel("gpu_apply_deltas_kernel")};
    const auto n = static_cast<std::uint32_t>(s.n);
    Arguments arguments(row.kernel.get());
    arguments.add(d.result).add(d.points).add(d.smoothed).add(nullptr).add(nullptr).add(0.5F);
    arguments.add(d.deltas).add(nullptr).add(n);
    for (const Buffer* buffer : {&d.framesIndexer, &d.framesPairs, &d.rest, &d.restFramesInverse})
        arguments.add(surface ? buffer : nullptr);
    arguments.add(nullptr).add(0.0F).add(n);
    row.phase.plain = [&s, surface] {
        if (surface)
            s.frames.transportDeltas(s.scratch, s.deltas, s.rest, s.restFramesInverse, s.smoothed, nullptr);
        else
            quill::parallelFor(s.n, [&](std::size_t i) { s.scratch[i] = s.smoothed[i] + s.deltas[i]; });
        blend(s);
    };
    return row;
}

void runSize(const Device& device, std::size_t side, const bench::Options& options, bench::Report& report) {
    Subject s(side);
    OnDevice d(device, s);
    std::array<Row, 6> rows{copying(s, d), gathering(s, d),       smoothing(s, d),
                            shapes(s, d),  applying(s, d, false), applying(s, d, true)};
    for (Row& row : rows)
        for (const std::size_t local : {64U, 128U, 256U}) {
            Phase phase = row.phase;
            phase.name += "/" + std::to_string(local);
            if (!options.wants(phase.name) || (options.isQuick && local != 64))
                continue;
            phase.ours = [&, local] { kernels::launch(device, row.kernel.get(), s.n, local, row.launches); };
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
    std::puts("A phase is KERNEL/LOCAL SIZE. A kernel's time is from its launch until it is waited for.");
    std::printf("CSV: %s\n", options->csvPath.c_str());
    return 0;
}
