// SPDX-License-Identifier: Apache-2.0
// A frame of a page's core: 20 k vertices, 100 shapes, a skin and four blend shapes, on one thread. The native build
// limited to what every processor has (and as it is), and WebAssembly under node between two rounds of it.
//   bench_viewer   (options as every benchmark; viewer.wasm and viewer_frame.mjs are where the build has them)
#include "clients/viewer/core/SampleCharacter.h"
#include "options.h"
#include "quill/InstructionSet.h"
#include "support/TemporaryFolder.h"
#include "viewer/Character.h"

#include <oneapi/tbb/global_control.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <ctime>
#include <fstream>
#include <map>

namespace {

using Clock = std::chrono::steady_clock;
using Milliseconds = std::map<std::string, double>; ///< medians, by what is done

template <class Body>
double median(double seconds, const Body& body) {
    std::vector<double> times;
    const auto end = Clock::now() + std::chrono::duration<double>(seconds);
    for (std::size_t i = 0; Clock::now() < end || times.size() < 5; ++i) {
        const std::clock_t start = std::clock(); // of the processor: others may be at work on the machine
        body(i);
        times.push_back(1000.0 * static_cast<double>(std::clock() - start) / CLOCKS_PER_SEC);
    }
    std::nth_element(times.begin(), times.begin() + static_cast<std::ptrdiff_t>(times.size() / 2), times.end());
    return times[times.size() / 2];
}

Milliseconds measureNative(const SampleCharacter& sample, double seconds) {
    const tbb::global_control one(tbb::global_control::max_allowed_parallelism, 1);
    Milliseconds times;
    const viewer::Blocks blocks = sample.blocks();
    times["open"] = median(0.0, [&](std::size_t) { viewer::Character character(blocks); });
    viewer::Character character(blocks);
    times["frame"] = median(seconds, [&](std::size_t i) { character.showFrame(i % character.frameCount()); });
    std::vector<double> values(character.sliderCount());
    times["sliders"] = median(seconds, [&](std::size_t i) {
        std::fill(values.begin(), values.end(), 0.001 * static_cast<double>(i % 100));
        character.showSliders(0, values);
    });
    times["normals"] = median(seconds, [&](std::size_t i) {
        character.showFrame(i % character.frameCount());
        character.drawNormals(viewer::Shape::neural);
    });
    return times;
}

/// Empty where node, or viewer.wasm, is missing.
Milliseconds measureWebAssembly(const SampleCharacter& sample, double seconds) {
    const TemporaryFolder folder;
    sample.write(folder.path() / "blocks");
    const std::string results = (folder.path() / "results").string();
    const std::string command = "node '" NW_VIEWER_FRAME "' '" NW_VIEWER_WASM "' '" +
                                (folder.path() / "blocks").string() + "' " + std::to_string(seconds) + " >'" + results +
                                '\'';
    Milliseconds times;
    if (std::system(command.c_str()) != 0) // NOLINT(concurrency-mt-unsafe,bugprone-command-processor): one thread
        return times;
    std::ifstream lines(results);
    std::string what;
    for (double time = 0.0; lines >> what >> time;)
        times[what] = time;
    return times;
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    SampleCharacter sample({.grid = 140, .frames = 16, .controls = 60, .shapes = 100, .basisBytes = 2, .hidden = 256});
    const Milliseconds asItIs = measureNative(sample, options->seconds);
    quill::limitInstructionSet(quill::InstructionSet::plain);
    const Milliseconds before = measureNative(sample, options->seconds);
    const Milliseconds wasm = measureWebAssembly(sample, options->seconds);
    const Milliseconds after = measureNative(sample, options->seconds);
    std::printf("%zu vertices, 100 shapes, 5 passes; medians in ms of processor time, on one thread\n",
                sample.mesh().vertexCount());
    std::printf("%-10s %12s %12s %12s %8s\n", "", "native", "scalar", "WebAssembly", "/scalar");
    std::fprintf(options->csv.get(), "what,native_ms,scalar_ms,wasm_ms\n");
    for (const auto& [what, native] : asItIs) {
        const double scalar = std::min(before.at(what), after.at(what));
        const double page = wasm.count(what) != 0 ? wasm.at(what) : 0.0;
        std::printf("%-10s %12.3f %12.3f %12.3f %8.2f\n", what.c_str(), native, scalar, page, page / scalar);
        std::fprintf(options->csv.get(), "%s,%g,%g,%g\n", what.c_str(), native, scalar, page);
    }
    if (wasm.empty())
        std::printf("(node or viewer.wasm is missing)\n");
}
