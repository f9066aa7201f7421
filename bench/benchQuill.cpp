// SPDX-License-Identifier: Apache-2.0
// bench_quill: every phase of the geometry library beside its yardsticks, on generated meshes of three sizes, on one
// core and on all. See Report::legend for the columns.
#include "eigenProduct.h"
#include "harness.h"
#include "options.h"
#include "plainLoops.h"
#include "probes.h"
#include "support/meshZoo.h"

#include "quill/Smoother.h"
#include "quill/SurfaceTransport.h"
#include "quill/VertexConnections.h"
#include "quill/VertexFrames.h"
#include "quill/bulk.h"

#include <cmath>
#include <cstdlib>
#include <exception>
#include <numbers>
#include <string>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

namespace {

using bench::Phase;
using plain::Points;

// Everything the phases of one mesh run on. Ours and the plain loop work on the same arrays: where those happen to lie
// in memory must not decide between them.
struct Subject {
    std::string name;
    std::size_t n;
    Points points, smoothed, scratch;
    quill::MeshTopology topology;
    quill::IndexMapper map;
    quill::VertexConnections connections, rebuilt;
    quill::VertexFrames frames, rebuiltFrames;
    std::vector<float> weights, floats;
    std::vector<quill::mat4d> matrices;
    std::vector<quill::mat4d> inverses; // of the frames at rest
    quill::Smoother smoother;
    quill::Smoother::Scratch smootherScratch;
    quill::SurfaceTransport transport;
    quill::PaddedPoints padded;
    quill::mat4d motion{{0.8, 0.6, 0, 0, -0.6, 0.8, 0, 0, 0, 0, 1, 0, 1e-3, 2e-3, 0, 1}};

    Subject(std::string nameIn, const ZooMesh& mesh)
        : name(std::move(nameIn))
        , n(mesh.vertexCount())
        , points(mesh.points)
        , smoothed(points)
        , scratch(n)
        , topology(mesh.topology())
        , matrices(n) {
        map.setIdentity(n);
        connections.build(topology, map, 0, false);
        frames.build(topology, map, &points);
        connections.calculateConnectionWeights(weights, points, 1.0, 0.0);
        floats.resize(16 * n);
        smoother.build(connections, weights, n);
        frames.calculateFrames(inverses, points, map, true, nullptr);
        transport.build(frames, points, inverses, n, nullptr);
        smoother.run(points, 0, padded, smootherScratch);
    }

    Phase phase(std::string phaseName, std::size_t bytes) const { return {std::move(phaseName), name, n, bytes}; }
};

// Bytes that must move: every array of the phase once, read or written.
std::size_t tableBytes(const Subject& s) {
    return 4 * (s.connections.connections().size() + s.connections.connectionsIndexer().size());
}
std::size_t pairBytes(const Subject& s) {
    return 4 * (s.frames.framesPairs().size() + s.frames.framesIndexer().size());
}

Phase smoothing(Subject& s, EigenProduct& eigen) {
    // a call is ten passes, as a deformer would make; the yardsticks run the same ten
    constexpr std::size_t passes = 10;
    Phase phase = s.phase("smoothing pass", 24 * s.n + tableBytes(s) + 4 * s.weights.size());
    phase.perCall = passes;
    phase.ours = [&s] { s.connections.mushArray(s.smoothed, s.scratch, passes, 1.0F, nullptr, &s.weights, false); };
    phase.plain = [&s] {
        for (std::size_t i = 0; i < passes; ++i) {
            s.scratch.swap(s.smoothed);
            plain::smoothingPass(s.scratch, s.smoothed, s.connections.connectionsIndexer(), s.connections.connections(),
                                 s.weights);
        }
    };
    phase.eigen = [&eigen] {
        for (std::size_t i = 0; i < passes; ++i)
            eigen.pass();
    };
    return phase;
}

// As a frame has it: from points to smoothed points in rows, in ten passes.
Phase smoothingFrame(Subject& s) {
    constexpr std::size_t passes = 10;
    Phase phase = s.phase("frame smoothing", 0);
    phase.perCall = passes;
    phase.ours = [&s] { s.smoother.run(s.points, passes, s.padded, s.smootherScratch); };
    phase.plain = [&s] {
        s.smoothed = s.points;
        for (std::size_t i = 0; i < passes; ++i) {
            s.scratch.swap(s.smoothed);
            plain::smoothingPass(s.scratch, s.smoothed, s.connections.connectionsIndexer(), s.connections.connections(),
                                 s.weights);
        }
    };
    return phase;
}

// Frames and transport as a frame has them, beside one vertex after another.
Phase transporting(Subject& s) {
    Phase phase = s.phase("frame transport", 0);
    phase.ours = [&s] { s.transport.run(s.smoothed, s.points, s.padded); };
    phase.plain = [&s] { s.frames.transportDeltas(s.smoothed, s.points, s.points, s.inverses, s.points, nullptr); };
    return phase;
}

Phase weighing(Subject& s) {
    Phase phase = s.phase("weights", 12 * s.n + tableBytes(s) + 4 * s.weights.size());
    phase.ours = [&s] { s.connections.calculateConnectionWeights(s.weights, s.points, 1.0, 0.0); };
    phase.plain = [&s] {
        plain::connectionWeights(s.weights, s.points, s.connections.connectionsIndexer(), s.connections.connections());
    };
    return phase;
}

Phase framing(Subject& s, bool invert) {
    Phase phase = s.phase(invert ? "rest frames" : "frames", (12 + sizeof(quill::mat4d)) * s.n + pairBytes(s));
    phase.ours = [&s, invert] { s.frames.calculateFrames(s.matrices, s.points, s.map, invert, nullptr); };
    phase.plain = [&s, invert] {
        plain::frames(s.matrices, s.points, s.frames.framesIndexer(), s.frames.framesPairs(), invert);
    };
    return phase;
}

Phase transforming(Subject& s) {
    Phase phase = s.phase("multAsPoint", 24 * s.n);
    phase.ours = [&s] { quill::multAsPoint(s.smoothed, s.motion); };
    phase.plain = [&s] { plain::transformPoints(s.smoothed, s.motion); };
    return phase;
}

Phase inverting(Subject& s) {
    Phase phase = s.phase("invertFrames", 2 * sizeof(quill::mat4d) * s.n);
    phase.ours = [&s] { quill::invertFrames(s.matrices); };
    phase.plain = [&s] { plain::invertFrames(s.matrices); };
    return phase;
}

Phase narrowing(Subject& s) {
    Phase phase = s.phase("floats", (sizeof(quill::mat4d) + 64) * s.n);
    phase.ours = [&s] { quill::convertToFloatArray(s.matrices, s.floats); };
    phase.plain = [&s] { plain::toFloats(s.matrices, s.floats); };
    return phase;
}

Phase buildingConnections(Subject& s) {
    Phase phase = s.phase("build adjacency", 0);
    phase.parallel = false;
    phase.ours = [&s] { s.rebuilt.build(s.topology, s.map, 0, false); };
    phase.plain = [&s] {
        if (plain::adjacencyBySets(s.topology, s.n) != s.connections.connections().size())
            std::abort();
    };
    return phase;
}

Phase buildingFrames(Subject& s) {
    Phase phase = s.phase("build frames", 0);
    phase.parallel = false;
    phase.ours = [&s] { s.rebuiltFrames.build(s.topology, s.map, &s.points); };
    return phase;
}

// One polygon of that many corners, every triple of which its full search would weigh.
void runCircle(std::size_t corners, std::size_t threads, const bench::Options& options, bench::Report& report) {
    ZooMesh circle{"circle", {{}}, {}};
    for (std::uint32_t c = 0; c < corners; ++c) {
        const double angle = 2.0 * std::numbers::pi * c / static_cast<double>(corners);
        circle.points.emplace_back(static_cast<float>(std::cos(angle)), static_cast<float>(std::sin(angle)), 0.0F);
        circle.polygons[0].push_back(c);
    }
    quill::MeshTopology topology = circle.topology();
    quill::IndexMapper map;
    map.setIdentity(corners);
    quill::VertexFrames frames;
    Phase phase{"build frames, n-gon", circle.name, corners, 0};
    phase.ours = [&] { frames.build(topology, map, &circle.points); };
    if (phase.name.starts_with(options.only))
        report.add(bench::measure(phase, threads, options.seconds));
}

// Smoothing of the same mesh with its vertices in any order, beside the ordered one.
void runOrder(const ZooMesh& mesh, std::size_t threads, const bench::Options& options, bench::Report& report) {
    constexpr std::size_t passes = 10;
    Phase phase{"frame order", "shuffled", mesh.vertexCount()};
    if (!phase.name.starts_with(options.only))
        return;
    Subject ordered("grid", mesh), mixed("shuffled", shuffled(mesh, 1));
    phase.perCall = passes;
    phase.ours = [&] { mixed.smoother.run(mixed.points, passes, mixed.padded, mixed.smootherScratch); };
    phase.plain = [&] { ordered.smoother.run(ordered.points, passes, ordered.padded, ordered.smootherScratch); };
    report.add(bench::measure(phase, threads, options.seconds));
}

void runMesh(const std::string& name, const ZooMesh& mesh, bool allPhases, std::size_t threads,
             const bench::Options& options, bench::Report& report) {
    Subject s(name, mesh);
    EigenProduct eigen(s.connections, s.weights, s.points);
    std::vector<Phase> phases{smoothing(s, eigen), smoothingFrame(s), framing(s, false)};
    if (allPhases) {
        phases.insert(phases.end(),
                      {transporting(s), weighing(s), framing(s, true), transforming(s), inverting(s), narrowing(s)});
    }
    if (threads == 1)
        phases.insert(phases.end(), {buildingConnections(s), buildingFrames(s)});
    for (const Phase& phase : phases)
        if (phase.name.starts_with(options.only))
            report.add(bench::measure(phase, threads, options.seconds));
}

void runAll(std::size_t threads, const bench::Options& options, bench::Report& report) {
    struct Size {
        std::size_t gridSide;
        std::size_t subdivisions; // 4^s * 10 + 2 vertices
    };
    for (const Size& size : {Size{100, 5}, Size{316, 7}, Size{1000, 8}}) {
        const ZooMesh grid = makeGrid(size.gridSide - 1, size.gridSide - 1);
        runMesh("grid", grid, true, threads, options, report);
        runMesh("shuffled", shuffled(grid, 1), false, threads, options, report);
        if (size.gridSide < 1000)
            runOrder(grid, threads, options, report);
        runMesh("icosphere", makeIcosphere(size.subdivisions), false, threads, options, report);
    }
    for (const std::size_t corners : {std::size_t{512}, std::size_t{4096}})
        runCircle(corners, threads, options, report);
}

// In a process of its own, since the cores must be fixed before the first thread starts.
bool runOnCores(std::size_t count, const bench::Options& options) {
    std::fflush(nullptr);
    const pid_t child = fork();
    if (child < 0)
        return false;
    if (child > 0) {
        int status = 0;
        return waitpid(child, &status, 0) == child && WIFEXITED(status) && WEXITSTATUS(status) == 0;
    }
    int status = 0;
    try {
        bench::Report report(options.csv.get());
        runAll(bench::useCores(count), options, report);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_quill: %s\n", error.what());
        status = 1;
    }
    std::fflush(nullptr);
    _exit(status);
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    bench::Report(options->csv.get()).header();
    bool ok = runOnCores(1, *options);
    if (const std::size_t cores = std::thread::hardware_concurrency(); cores > 1)
        ok = runOnCores(cores, *options) && ok;
    bench::Report::legend(
        "a plain loop of the same shape, a set per vertex, one vertex after another, or vertices in order");
    std::printf("CSV: %s\n", options->csvPath.c_str());
    return ok ? 0 : 1;
}
