// SPDX-License-Identifier: Apache-2.0
// bench_gpu: the deformer's frames on an OpenCL device: where their time goes, how fast the kernels are beside a kernel
// that only copies, and whole frames beside those of the same scene on the CPU.
#include "PhaseClock.h"
#include "deviceProbes.h"
#include "kernelBytes.h"
#include "options.h"
#include "probes.h"
#include "warpFrame.h"

#include "openquarn_app/Gpu.h"
#include "openquarn_app/Messages.h"
#include "support/PipelineOn.h"

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <exception>
#include <map>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace {

using bench::PhaseClock;
using bench::quantile;
using bench::WarpFrame;
using bench::WarpSetting;
using neuralWarp::FrameStep;
using OpenQuarn::Gpu;
using OpenQuarn::GpuCounts;

using Seconds = std::vector<double>; // an entry a frame

constexpr double largestRatio = 1.5;      // of a frame to the CPU's
constexpr std::size_t ratioFrom = 99'000; // vertices from which that holds
constexpr double largestFixedCost = 80.0; // microseconds

const char* const smoothing = "averageVertKernel";
const char* const shapes = "gpu_principal_shapes_kernel";
const char* const apply = "gpu_apply_deltas_kernel";

// --- the table ---

struct Line {
    std::string name;
    const char* kind; // "device", by its own clock; "host", by the wall's; "ratio"
    Seconds seconds;
    std::size_t bytes = 0; // that must move; 0: no rate makes sense
    Seconds copies = {};   // of as many bytes, a kernel's; none: not compared
    double limit = 0.0;    // in what is printed; 0: none
};

class Table {
public:
    explicit Table(const bench::Options& options)
        : options_(options) {
        std::fputs("vertices,mode,model,smoothing,row,kind,best,median,p99,spread,bytes,gb_per_s,to_copy,limit,"
                   "cores_at_work\n",
                   options.csv.get());
    }

    void start(const WarpSetting& setting, std::size_t vertices) {
        cores_ = bench::coresAtWork(std::thread::hardware_concurrency());
        title_ = std::to_string(vertices) + (setting.isSurface ? ",Surface," : ",Offset,") + bench::modelName(setting) +
                 "," + std::to_string(setting.smoothing);
        std::printf("\n%zu vertices, %s, %s, %u smoothing passes; %.1f cores at work\n", vertices,
                    setting.isSurface ? "Surface" : "Offset", bench::modelName(setting).c_str(), setting.smoothing,
                    cores_);
        std::printf("  %-28s %-6s %10s %10s %10s %7s %8s %6s\n", "", "", "best us", "median us", "p99 us", "spread",
                    "GB/s", "/copy");
    }

    void add(const Line& line) const {
        if (line.seconds.empty() || !options_.wants(line.name))
            return;
        const double unit = std::string(line.kind) == "ratio" ? 1.0 : 1e6;
        const double best = quantile(line.seconds, 0.0) * unit, median = quantile(line.seconds, 0.5) * unit;
        const double p99 = quantile(line.seconds, 0.99) * unit;
        const double spread = (quantile(line.seconds, 0.9) - quantile(line.seconds, 0.1)) * unit / median;
        const double rate = static_cast<double>(line.bytes) * 1e-3 / median;
        const double toCopy = line.copies.empty() ? 0.0 : median * 1e-6 / quantile(line.copies, 0.5);
        std::printf("  %-28s %-6s %10.*f %10.*f %10.*f %6.0f%%", line.name.c_str(), line.kind, unit == 1.0 ? 2 : 1,
                    best, unit == 1.0 ? 2 : 1, median, unit == 1.0 ? 2 : 1, p99, 100.0 * spread);
        printOr(" %8.2f", rate);
        printOr(" %6.2f", toCopy);
        if (line.limit > 0.0)
            std::printf("  limit %.1f: %s by the best, %s by the median", line.limit,
                        best <= line.limit ? "held" : "EXCEEDED", median <= line.limit ? "held" : "EXCEEDED");
        std::printf("\n");
        std::fflush(stdout);
        std::fprintf(options_.csv.get(), "%s,%s,%s,%.3f,%.3f,%.3f,%.4f,%zu,%.4f,%.4f,%.1f,%.2f\n", title_.c_str(),
                     line.name.c_str(), line.kind, best, median, p99, spread, line.bytes, rate, toCopy, line.limit,
                     cores_);
        std::fflush(options_.csv.get());
    }

private:
    static void printOr(const char* format, double value) {
        if (value > 0.0)
            std::printf(format, value); // NOLINT(clang-diagnostic-format-nonliteral)
        else
            std::printf("%*s", format[2] == '8' ? 9 : 7, "-");
    }

    const bench::Options& options_;
    std::string title_;
    double cores_ = 0.0;
};

// --- frames ---

// A single frame, after a pause of the one before.
double runAfter(WarpFrame& frame, double pause) {
    std::this_thread::sleep_for(std::chrono::duration<double>(pause));
    return frame.run();
}

enum class Pace { single, inARow }; // with pauses of a frame's length, or without

Seconds runFrames(WarpFrame& frame, std::size_t count, Pace pace = Pace::single) {
    constexpr int warmUps = 3; // on the device: the CPU's, the one that uploads everything, and one more
    double last = 0.0;
    for (int i = 0; i < warmUps; ++i)
        last = frame.run();
    Gpu::resetCounts();
    Seconds seconds;
    for (std::size_t i = 0; i < count; ++i)
        seconds.push_back(last = pace == Pace::single ? runAfter(frame, last) : frame.run());
    if (Gpu::isEnabled() && Gpu::counts().gpuEvaluations != count)
        throw std::runtime_error("the frames did not run on the device");
    return seconds;
}

struct Walls {
    Seconds gpu, cpu;
    Seconds ratios; // an entry a round
};

// In turn, so that both see the same minutes of the machine.
Walls measureWalls(WarpFrame& frame, const bench::Options& options) {
    const std::size_t count = frame.vertices() > 500'000 ? 5 : 10;
    constexpr std::size_t fewestRounds = 3;
    Walls walls;
    const auto start = std::chrono::steady_clock::now();
    const std::chrono::duration<double> wanted(10.0 * options.seconds);
    while (walls.ratios.size() < fewestRounds || std::chrono::steady_clock::now() - start < wanted) {
        Seconds gpu;
        {
            const PipelineOn on;
            gpu = runFrames(frame, count);
        }
        const Seconds cpu = runFrames(frame, count);
        walls.ratios.push_back(quantile(gpu, 0.5) / quantile(cpu, 0.5));
        walls.gpu.insert(walls.gpu.end(), gpu.begin(), gpu.end());
        walls.cpu.insert(walls.cpu.end(), cpu.begin(), cpu.end());
    }
    return walls;
}

// --- phases ---

struct Phases {
    std::map<std::string, Seconds> device, host;
    std::map<std::string, Seconds> copies; // beside the kernel of that name
    Seconds buffers;                       // a copy from buffer to buffer, as the deformer makes before it smooths
    Seconds kernels;                       // all commands but uploads and downloads, and that copy
};

std::map<std::string, std::size_t> bytesOf(WarpFrame& frame, const WarpSetting& setting) {
    const neuralWarp::neuralWarpData& data = frame.state();
    const std::size_t n = frame.vertices();
    const std::size_t pairs = data.vertexFrames.framesPairs().size();
    std::map<std::string, std::size_t> bytes{
        {"upload", bench::bytesOf(n, 0)},
        {"download", bench::bytesOf(n, 0)},
        {"copyToAffectBuffer", bench::bytesOf(2 * n, 0)},
        {apply, setting.isSurface ? bench::surfaceBytes(n, pairs) : bench::offsetBytes(n)}};
    if (setting.smoothing > 0)
        bytes[smoothing] = setting.smoothing * bench::smoothingBytes(n, data.vertexConnections.connections().size());
    if (setting.shapes > 0)
        bytes[shapes] = bench::shapesBytes(n, setting.shapes);
    return bytes;
}

void addCounts(Phases& phases, const GpuCounts& counts, const PhaseClock& clock) {
    double kernels = phases.buffers.empty() ? 0.0 : phases.buffers.back();
    for (const auto& [name, seconds] : counts.seconds) {
        phases.device[name].push_back(seconds);
        if (name != "upload" && name != "download")
            kernels += seconds;
    }
    phases.kernels.push_back(kernels);
    for (const auto& [name, seconds] : counts.hostSeconds)
        phases.host[name].push_back(seconds);
    const auto of = [&](FrameStep phase) { return clock.seconds[static_cast<std::size_t>(phase)]; };
    phases.host["inference"].push_back(of(FrameStep::network));
    phases.host["prepare, controls"].push_back(of(FrameStep::prepare) + of(FrameStep::gather));
    phases.host["upload outputs, find kernels"].push_back(of(FrameStep::points));
    phases.host["enqueue"].push_back(of(FrameStep::apply));
}

// One pass at a time: a copy of that many bytes.
void addCopies(Phases& phases, bench::DeviceProbes& probes, const WarpSetting& setting,
               const std::map<std::string, std::size_t>& bytes) {
    for (const auto& [name, all] : bytes) {
        if (name == "upload" || name == "download")
            continue;
        const std::size_t passes = name == smoothing ? setting.smoothing : 1;
        phases.copies[name].push_back(static_cast<double>(passes) * probes.timeCopy(all / passes));
    }
}

Phases measurePhases(WarpFrame& frame, const WarpSetting& setting, const bench::Options& options) {
    const std::map<std::string, std::size_t> bytes = bytesOf(frame, setting);
    Gpu::setTiming(true);
    Phases phases;
    PhaseClock clock;
    {
        const PipelineOn on;
        runFrames(frame, 1);
        bench::DeviceProbes probes;
        addCopies(phases, probes, setting, bytes); // the first time, memory is new
        probes.timeBufferCopy(bench::bytesOf(frame.vertices(), 0));
        phases.copies.clear();
        frame.state().observer = &clock;
        const auto start = std::chrono::steady_clock::now();
        const std::chrono::duration<double> wanted(3.0 * options.seconds);
        for (double last = 0.0; phases.kernels.size() < 10 || std::chrono::steady_clock::now() - start < wanted;) {
            Gpu::resetCounts();
            last = runAfter(frame, last);
            if (setting.smoothing > 0)
                phases.buffers.push_back(probes.timeBufferCopy(bench::bytesOf(frame.vertices(), 0)));
            addCounts(phases, Gpu::counts(), clock);
            addCopies(phases, probes, setting, bytes);
        }
        frame.state().observer = &neuralWarp::FrameObserver::none();
    }
    Gpu::setTiming(false);
    return phases;
}

// --- rows ---

void addPhases(const Table& table, const Phases& phases, const std::map<std::string, std::size_t>& bytes) {
    const auto bytesIn = [&](const std::string& name) {
        const auto found = bytes.find(name);
        return found == bytes.end() ? 0 : found->second;
    };
    const std::pair<const char*, const char*> device[] = {
        {"upload", "upload"},     {"copyToAffectBuffer", "gather"}, {"copy", "copy of the input"},
        {smoothing, "smoothing"}, {shapes, "principal shapes"},     {apply, "apply"},
        {"download", "download"}};
    for (const auto& [name, values] : phases.host)
        table.add({name, "host", values, bytesIn(name)});
    table.add({"copy before smoothing", "device", phases.buffers, bytesIn("copyToAffectBuffer")});
    for (const auto& [name, text] : device)
        if (const auto found = phases.device.find(name); found != phases.device.end()) {
            const auto copies = phases.copies.find(name);
            const bool isTransfer = std::string(text) == name && copies == phases.copies.end(); // mapped: no bytes move
            table.add({text, "device", found->second, isTransfer ? 0 : bytesIn(name),
                       copies == phases.copies.end() ? Seconds() : copies->second});
        }
    table.add({"device-resident", "device", phases.kernels});
}

void benchFrame(const WarpSetting& setting, const bench::Options& options, Table& table) {
    WarpFrame frame(setting, WarpFrame::Change::input);
    table.start(setting, frame.vertices());
    addPhases(table, measurePhases(frame, setting, options), bytesOf(frame, setting));
    const Walls walls = measureWalls(frame, options);
    table.add({"frame with copies", "host", walls.gpu});
    table.add({"frame on the CPU", "host", walls.cpu});
    const double limit = frame.vertices() >= ratioFrom ? largestRatio : 0.0;
    table.add({"GPU/CPU", "ratio", walls.ratios, 0, {}, limit});
    table.add(
        {"GPU/CPU of the best frames", "ratio", {quantile(walls.gpu, 0.0) / quantile(walls.cpu, 0.0)}, 0, {}, limit});
}

// What a frame costs beside its kernels, where these have next to nothing to do.
void benchFixedCost(unsigned passes, const bench::Options& options, Table& table) {
    const WarpSetting tiny{4, true, 50, passes};
    WarpFrame frame(tiny, WarpFrame::Change::input);
    table.start(tiny, frame.vertices());
    const Phases phases = measurePhases(frame, tiny, options);
    addPhases(table, phases, {});
    const double kernels = quantile(phases.kernels, 0.5);
    const PipelineOn on;
    std::map<Pace, Seconds> fixed;
    for (int round = 0; round < 5; ++round)
        for (const Pace pace : {Pace::inARow, Pace::single})
            for (const double seconds : runFrames(frame, 300, pace))
                fixed[pace].push_back(seconds - kernels);
    table.add({"fixed cost in a row", "host", fixed[Pace::inARow], 0, {}, largestFixedCost});
    table.add({"fixed cost after a pause", "host", fixed[Pace::single], 0, {}, largestFixedCost});
}

void benchEmptyLaunch(const Table& table) {
    bench::DeviceProbes probes;
    const auto device = Gpu::currentDevice();
    std::printf("\n%s\n", device ? device->name.c_str() : "no device");
    Seconds seconds;
    for (int i = 0; i < 1000; ++i)
        seconds.push_back(probes.timeEmptyLaunch());
    table.add({"empty launch", "host", seconds});
}

std::vector<WarpSetting> settings(bool isQuick) {
    std::vector<WarpSetting> all;
    for (const std::size_t side : {100U, 316U, 1000U})
        if (!isQuick || side < 1000)
            for (const WarpSetting setting : {WarpSetting{side, true, 50, 10}, WarpSetting{side, false, 0, 0}})
                all.push_back(setting);
    return all;
}

void run(const bench::Options& options) {
    Gpu::chooseDevice(options.device);
    OpenQuarn::setMessageSink([](const OpenQuarn::Message&) {}); // the shapes come after the first frame
    Table table(options);
    benchEmptyLaunch(table);
    for (const unsigned passes : {0U, 10U})
        benchFixedCost(passes, options, table);
    if (!options.only.starts_with("fixed cost"))
        for (const WarpSetting& setting : settings(options.isQuick))
            benchFrame(setting, options, table);
    std::puts(
        "\ndevice   what ran on it, by its own clock; device-resident: all kernels and copies there\n"
        "host     by the wall's clock; \"wait\" is for kernels, and \"deform\" all of the deformer before they end\n"
        "GB/s     bytes that must move over the median\n"
        "/copy    time over that of a kernel on the same device that only copies, of as many bytes\n"
        "GPU/CPU  medians of whole frames in alternating rounds, each frame after a pause of its own length");
    std::printf("CSV: %s\n", options.csvPath.c_str());
}

} // namespace

int main(int argc, char** argv) {
    const auto options = bench::readOptions(argc, argv);
    if (!options)
        return 2;
    if (Gpu::devices().empty()) {
        std::puts("bench_gpu: there is no OpenCL device: nothing is measured");
        return 0;
    }
    try {
        run(*options);
    } catch (const std::exception& error) {
        std::fprintf(stderr, "bench_gpu: %s\n", error.what());
        return 1;
    }
    return 0;
}
