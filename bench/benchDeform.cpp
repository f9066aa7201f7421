// SPDX-License-Identifier: Apache-2.0
// bench_deform: single frames of the whole deformer in the host, with where the time goes, and the product of the
// principal shapes beside the memory's own speed.
#include "PhaseClock.h"
#include "harness.h"
#include "options.h"
#include "plainFrame.h"
#include "probes.h"
#include "warpFrame.h"

#include "frame/deltas.h"
#include "openquarn_app/Messages.h"
#include "storage/finite.h"

#include <oneapi/tbb/global_control.h>

#include <array>
#include <chrono>
#include <cmath>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <sched.h>
#include <sys/wait.h>
#include <thread>
#include <unistd.h>

namespace {

using bench::modelName;
using bench::PhaseClock;
using bench::quantile;
using bench::WarpFrame;
using bench::WarpSetting;
using neuralWarp::frameStepCount;

template <class Array>
std::size_t bytesOf(const Array& values) {
    return values.capacity() * sizeof(values[0]);
}

double stateBytesPerVertex(const neuralWarp::neuralWarpData& data, std::size_t vertices) {
    const std::size_t bytes = bytesOf(data.vertexFrames.framesPairs()) + bytesOf(data.vertexFrames.framesIndexer()) +
                              bytesOf(data.vertexConnections.connections()) +
                              bytesOf(data.vertexConnections.connectionsIndexer()) + bytesOf(data.connectionWeights) +
                              bytesOf(data.affectMap) + bytesOf(data.affectedVertices) + bytesOf(data.restPoints) +
                              bytesOf(data.restFramesInverse) + data.principalShapes.bytes() + data.workspace.bytes();
    return static_cast<double>(bytes) / static_cast<double>(vertices);
}

// Phases and total of each frame, after a pause of one frame time.
struct Samples {
    std::array<std::vector<double>, frameStepCount> phases;
    std::vector<double> total, rest;
};

Samples sample(WarpFrame& frame, double seconds) {
    constexpr std::size_t fewest = 20;
    Samples samples;
    PhaseClock clock;
    frame.state().observer = &clock;
    const auto start = std::chrono::steady_clock::now();
    const auto elapsed = [&] {
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    };
    for (double last = frame.run(); samples.total.size() < fewest || elapsed() < seconds;) {
        std::this_thread::sleep_for(std::chrono::duration<double>(last));
        last = frame.run();
        double known = 0.0;
        for (std::size_t p = 0; p < frameStepCount; ++p) {
            samples.phases[p].push_back(clock.seconds[p]);
            known += clock.seconds[p];
        }
        samples.total.push_back(last);
        samples.rest.push_back(last - known);
    }
    frame.state().observer = &neuralWarp::FrameObserver::none();
    return samples;
}

constexpr const char* columns[] = {"prepare", "gather", "network", "points", "deltas", "apply", "fetch", "blend"};

void printHeader(std::FILE* csv) {
    std::printf("%7s %-7s %-7s %3s %3s %8s %8s", "verts", "mode", "model", "smo", "thr", "us", "p99");
    std::fputs("vertices,mode,model,smoothing,threads,us_median,us_p99", csv);
    for (const char* column : columns) {
        std::printf(" %7s", column);
        std::fprintf(csv, ",%s_us", column);
    }
    std::printf(" %7s %5s %6s\n", "rest", "rest%", "B/vert");
    std::fputs(",rest_us,rest_percent,state_bytes_per_vertex\n", csv);
}

void report(const WarpSetting& setting, unsigned threads, WarpFrame& frame, const Samples& samples, std::FILE* csv) {
    const double total = quantile(samples.total, 0.5) * 1e6, p99 = quantile(samples.total, 0.99) * 1e6;
    const double rest = quantile(samples.rest, 0.5) * 1e6;
    const double bytes = stateBytesPerVertex(frame.state(), frame.vertices());
    const char* mode = setting.isSurface ? "Surface" : "Offset";
    std::printf("%7zu %-7s %-7s %3u %3u %8.0f %8.0f", frame.vertices(), mode, modelName(setting).c_str(),
                setting.smoothing, threads, total, p99);
    std::fprintf(csv, "%zu,%s,%s,%u,%u,%.1f,%.1f", frame.vertices(), mode, modelName(setting).c_str(),
                 setting.smoothing, threads, total, p99);
    for (const std::vector<double>& phase : samples.phases) {
        std::printf(" %7.0f", quantile(phase, 0.5) * 1e6);
        std::fprintf(csv, ",%.1f", quantile(phase, 0.5) * 1e6);
    }
    std::printf(" %7.0f %5.1f %6.0f\n", rest, 100.0 * rest / total, bytes);
    std::fprintf(csv, ",%.1f,%.2f,%.1f\n", rest, 100.0 * rest / total, bytes);
    std::fflush(stdout);
    std::fflush(csv);
}

std::vector<WarpSetting> settings(bool isQuick) {
    if (isQuick)
        return {{32, true, 50, 10}, {100, true, 20, 10}, {316, false, 20, 0}, {316, true, 50, 10}, {316, true, 0, 10}};
    std::vector<WarpSetting> all;
    for (const std::size_t side : {32U, 100U, 316U, 1000U})
        for (const bool isSurface : {false, true})
            for (const unsigned smoothing : {0U, 10U})
                for (const std::size_t shapes : {0U, 20U, 50U, 100U})
                    if (side < 1000 || shapes == 20)
                        all.push_back({side, isSurface, shapes, smoothing});
    return all;
}

// The network's threads and ours are as many as the cores that the process may use from its start.
void useCores(unsigned count) {
    cpu_set_t cores;
    CPU_ZERO(&cores);
    for (unsigned core = 0; core < count; ++core)
        CPU_SET(core, &cores);
    sched_setaffinity(0, sizeof cores, &cores);
}

// Whole frames of ours and of the plain yardstick, in turn.
struct Pairs {
    std::vector<double> ours, plain, ratios;
};

Pairs inTurn(WarpFrame& frame, plain::Frame& plainFrame, bool isPaused, double seconds) {
    constexpr std::size_t fewest = 15;
    Pairs pairs;
    const auto timed = [&](double& last, const auto& run) {
        if (isPaused)
            std::this_thread::sleep_for(std::chrono::duration<double>(last));
        else
            run(); // brings back what the other one drove out of the caches
        last = run();
        return last;
    };
    const auto runPlain = [&] {
        const std::vector<float> controls = frame.controls();
        const auto start = std::chrono::steady_clock::now();
        plainFrame.run(controls);
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
    };
    const auto start = std::chrono::steady_clock::now();
    double lastOurs = frame.run(), lastPlain = runPlain();
    while (pairs.ratios.size() < fewest ||
           std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count() < seconds) {
        pairs.ours.push_back(timed(lastOurs, [&] { return frame.run(); }));
        pairs.plain.push_back(timed(lastPlain, runPlain));
        pairs.ratios.push_back(pairs.ours.back() / pairs.plain.back());
    }
    return pairs;
}

// The largest distance in any coordinate of what the two make of the same controls.
double largestDifference(const WarpFrame& frame, plain::Frame& plainFrame) {
    plainFrame.run(frame.controls());
    const HPointArray ours = frame.output();
    double largest = 0.0;
    for (std::size_t i = 0; i < ours.length(); ++i) {
        const HPoint& p = plainFrame.output()[i];
        largest = std::max({largest, std::abs(p.x - ours[i].x), std::abs(p.y - ours[i].y), std::abs(p.z - ours[i].z)});
    }
    return largest;
}

std::vector<WarpSetting> plainSettings(bool isQuick) {
    if (isQuick)
        return {{100, true, 50, 10}, {316, true, 50, 10}};
    return {{100, true, 50, 10}, {316, true, 50, 10},      {316, false, 50, 10},    {1000, true, 50, 10},
            {100, true, 0, 10},  {100, true, 0, 10, true}, {316, true, 0, 10, true}};
}

void benchPlain(const bench::Options& options, unsigned threads) {
    useCores(threads);
    const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
    OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {}); // the shapes come after the first frame
    for (const WarpSetting& setting : plainSettings(options.isQuick)) {
        WarpFrame frame(setting);
        plain::Frame plainFrame(frame.state(), frame.input(), setting.isSurface, setting.smoothing);
        if (const double off = largestDifference(frame, plainFrame); !(off < 1e-5))
            throw std::runtime_error("the plain frame is " + std::to_string(off) + " away from ours");
        for (const bool isPaused : {false, true}) {
            const Pairs pairs = inTurn(frame, plainFrame, isPaused, options.seconds);
            const double ours = quantile(pairs.ours, 0.5), plain = quantile(pairs.plain, 0.5);
            const double tail = quantile(pairs.ours, 0.99) / ours;
            std::printf("%7zu %-7s %-13s %3u %-6s %8.0f %8.0f %6.2f %7.2f\n", frame.vertices(),
                        setting.isSurface ? "Surface" : "Offset", modelName(setting).c_str(), threads,
                        isPaused ? "paused" : "hot", ours * 1e6, plain * 1e6, quantile(pairs.ratios, 0.5), tail);
            std::fprintf(options.csv.get(), "plain,%zu,%s,%s,%u,%s,%.1f,%.1f,%.3f,%.2f\n", frame.vertices(),
                         setting.isSurface ? "Surface" : "Offset", modelName(setting).c_str(), threads,
                         isPaused ? "paused" : "hot", ours * 1e6, plain * 1e6, quantile(pairs.ratios, 0.5), tail);
            std::fflush(stdout);
        }
    }
}

void benchFrames(const bench::Options& options, unsigned threads) {
    useCores(threads);
    const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
    OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {}); // the shapes come after the first frame
    for (const WarpSetting& setting : settings(options.isQuick)) {
        WarpFrame frame(setting);
        report(setting, threads, frame, sample(frame, options.seconds), options.csv.get());
    }
}

std::size_t residentBytes() {
    std::size_t pages = 0, resident = 0;
    std::ifstream("/proc/self/statm") >> pages >> resident;
    return resident * static_cast<std::size_t>(sysconf(_SC_PAGESIZE));
}

// One frame of each of many characters, and as many of the first, in turn.
void benchMany(const bench::Options& options, unsigned threads, const WarpSetting& setting) {
    constexpr std::size_t characters = 64;
    useCores(threads);
    const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
    OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {}); // the shapes come after the first frame
    const std::size_t before = residentBytes();
    const auto residentWith = [&] { return static_cast<double>(residentBytes() - before) / 1e6; };
    double ofOne = 0.0;
    {
        WarpFrame one(setting);
        ofOne = residentWith();
    }
    WarpFrame frame(setting, WarpFrame::Change::control, characters);
    const double further = (residentWith() - ofOne) / static_cast<double>(characters - 1);
    std::vector<double> many, same, ratios;
    const auto frames = [&](std::size_t step) {
        double seconds = 0.0;
        for (std::size_t i = 0; i < characters; ++i)
            seconds += frame.run(i * step);
        return seconds / static_cast<double>(characters);
    };
    const auto start = std::chrono::steady_clock::now();
    while (ratios.size() < 7 ||
           std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count() < options.seconds) {
        many.push_back(frames(1));
        same.push_back(frames(0));
        ratios.push_back(many.back() / same.back());
    }
    std::printf("%7zu %-7s %3u %8.0f %8.0f %6.2f %8.2f %8.2f\n", frame.vertices(), modelName(setting).c_str(), threads,
                quantile(many, 0.5) * 1e6, quantile(same, 0.5) * 1e6, quantile(ratios, 0.5), ofOne, further);
    std::fprintf(options.csv.get(), "many,%zu,%s,%u,%.1f,%.1f,%.3f,%.3f,%.3f\n", frame.vertices(),
                 modelName(setting).c_str(), threads, quantile(many, 0.5) * 1e6, quantile(same, 0.5) * 1e6,
                 quantile(ratios, 0.5), ofOne, further);
}

// In a process of its own, because the network's threads are counted once.
void inChild(const bench::Options& options, unsigned threads, void (*run)(const bench::Options&, unsigned)) {
    std::fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
        run(options, threads);
        std::fflush(nullptr);
        _exit(0);
    }
    int status = 0;
    if (child < 0 || waitpid(child, &status, 0) != child || status != 0)
        throw std::runtime_error("the frames on " + std::to_string(threads) + " threads failed");
}

void benchProduct(const bench::Options& options) {
    bench::Report table(options.csv.get());
    table.header();
    for (const std::size_t vertices : {10000U, 100000U, 1000000U})
        for (const std::size_t shapes : {20U, 50U, 100U}) {
            if (vertices == 1000000 && (shapes != 20 || options.isQuick))
                continue;
            const std::vector<float> coefficients(shapes, 0.25F);
            neuralWarp::PrincipalBasis basis;
            basis.assign(std::vector<float>(3 * shapes * vertices, 0.5F), shapes);
            neuralWarp::Points deltas, unused;
            bench::Phase phase;
            phase.name = "product S=" + std::to_string(shapes);
            phase.mesh = "-";
            phase.vertices = vertices;
            phase.bytes = basis.bytes();
            bench::ReadProbe probe(basis.bytes());
            phase.plain = [&] { probe.run(); };
            phase.ours = [&] {
                extractPrincipalDeltas(deltas, coefficients, basis, neuralWarp::DrivenVertices(vertices), {}, unused);
            };
            for (const unsigned threads : {1U, 2U}) {
                const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
                table.add(bench::measure(phase, threads, options.seconds));
            }
        }
}

// What quarn adds to each frame that it delivers, beside the frame itself.
void benchFinite(const bench::Options& options) {
    OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {}); // the shapes come after the first frame
    std::printf("%7s %-7s %-7s %3s %9s %9s %6s\n", "verts", "mode", "model", "smo", "frame us", "check us", "check%");
    for (const WarpSetting& setting : {WarpSetting{316, false, 20, 0}, WarpSetting{316, true, 20, 10}}) {
        WarpFrame frame(setting);
        std::vector<float> points(3 * frame.vertices());
        std::vector<double> frames, checks;
        const auto end = std::chrono::steady_clock::now() + std::chrono::duration<double>(options.seconds);
        while (std::chrono::steady_clock::now() < end || frames.size() < 20) {
            frames.push_back(frame.run());
            std::fill(points.begin(), points.end(), 0.5F); // they have just been read when they are looked at
            const auto start = std::chrono::steady_clock::now();
            if (storage::firstNotFinite(points))
                throw std::runtime_error("0.5 is no finite number");
            checks.push_back(std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count());
        }
        // the best of each: on a busy machine, what both would take on an idle one
        const double whole = quantile(frames, 0.0) * 1e6, check = quantile(checks, 0.0) * 1e6;
        std::printf("%7zu %-7s %-7s %3u %9.0f %9.1f %6.2f\n", frame.vertices(),
                    setting.isSurface ? "Surface" : "Offset", modelName(setting).c_str(), setting.smoothing, whole,
                    check, 100.0 * check / whole);
    }
}

int run(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    if (options->wants("frames")) {
        std::printf("single frames, each after a pause of one frame time: medians in us; rest: what the host does\n");
        printHeader(options->csv.get());
        for (const unsigned threads : {1U, 2U})
            inChild(*options, threads, benchFrames);
    }
    if (options->wants("plain")) {
        std::printf(
            "whole frames beside plain ones, in turn, medians in us; hot: one after the other, paused: after one "
            "frame time; p99: of ours, over its median\n");
        std::printf("%7s %-7s %-13s %3s %-6s %8s %8s %6s %7s\n", "verts", "mode", "model", "thr", "", "ours", "plain",
                    "/plain", "p99");
        std::fputs("kind,vertices,mode,model,threads,state,us,plain_us,ratio,p99_over_median\n", options->csv.get());
        for (const unsigned threads : {1U, 2U})
            inChild(*options, threads, benchPlain);
    }
    if (options->wants("many")) {
        std::printf(
            "64 characters of one model, a frame of each, beside as many frames of one: us a frame; resident MB "
            "of the first, and of each further one\n");
        std::printf("%7s %-7s %3s %8s %8s %6s %8s %8s\n", "verts", "model", "thr", "each", "one", "/one", "first",
                    "further");
        std::fputs("kind,vertices,model,threads,each_us,one_us,ratio,first_mb,further_mb\n", options->csv.get());
        inChild(*options, 1, [](const auto& o, unsigned threads) { benchMany(o, threads, {50, true, 50, 10}); });
        inChild(*options, 1, [](const auto& o, unsigned threads) { benchMany(o, threads, {100, true, 50, 10}); });
    }
    if (options->wants("finite")) {
        std::printf("whether a frame has only finite coordinates, looked at after each frame (at most 2 %%)\n");
        benchFinite(*options);
    }
    if (options->wants("product")) {
        std::printf("the product of the principal shapes; /plain: time over that of reading the same "
                    "bytes, /limit: over that of a triad of them\n");
        benchProduct(*options);
    }
    return 0;
}

} // namespace

int main(int argc, char** argv) {
    try {
        ::setenv(neuralWarp::modelOptionsVariable, "1", 0); // as quarn does
        return run(argc, argv);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_deform: %s\n", error.what());
        return 1;
    }
}
