// SPDX-License-Identifier: Apache-2.0
#include "secondCore.h"

#include "probes.h"

#include "nw_model/ModelSession.h"
#include "plugin/deformer/support/modelFolder.h"
#include "support/TemporaryFolder.h"

#include <oneapi/tbb/global_control.h>
#include <oneapi/tbb/parallel_for.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cmath>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace bench {
namespace {

using neuralWarp::ModelSession;
namespace fs = std::filesystem;

constexpr std::size_t controlCount = 16;

double secondsOf(const std::function<void()>& run) {
    const auto start = std::chrono::steady_clock::now();
    run();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

double median(std::vector<double> values) {
    const auto middle = values.begin() + static_cast<std::ptrdiff_t>(values.size() / 2);
    std::nth_element(values.begin(), middle, values.end());
    return *middle;
}

// As long as the loops of a frame, and without memory that a network could drive out of the caches.
class Loop {
public:
    void run() {
        tbb::parallel_for(std::size_t{0}, sums_.size(), [this](std::size_t i) { sums_[i] = work(sums_[i]); });
    }

private:
    static float work(float value) {
        for (int i = 0; i < 2000; ++i)
            value = std::sqrt(value * value + 1.0F) - 0.5F;
        return value;
    }
    std::array<float, 256> sums_{};
};

// A network of so many bytes of weights.
fs::path writeNetwork(const fs::path& folder, std::size_t bytes, bool hasEntry) {
    ModelSpec spec;
    spec.controls = controlCount;
    spec.bias.resize(bytes / sizeof(float) / (controlCount + 1));
    if (hasEntry)
        spec.options = R"({"session_options": {"intra_op_num_threads": 1}})";
    fs::path path = folder / (std::to_string(bytes) + (hasEntry ? "-entry.onnx" : ".onnx"));
    writeFile(path, networkBytes(spec));
    return path;
}

struct Times {
    std::vector<double> alone, after, network;
};

// The loop on its own while there is no session, whose threads would be at work; then with one, just after each run.
void addRound(Times& times, Loop& loop, const fs::path& path) {
    constexpr int frames = 15;
    for (int i = 0; i < frames; ++i)
        times.alone.push_back(secondsOf([&] { loop.run(); }));
    ModelSession session;
    session.load(path, true);
    const std::vector<float> controls(controlCount, 0.25F);
    for (int i = 0; i < frames; ++i) {
        times.network.push_back(secondsOf([&] {
            if (session.run(controls).empty())
                throw std::runtime_error(session.errorText());
        }));
        times.after.push_back(secondsOf([&] { loop.run(); }));
    }
}

void report(std::size_t bytes, bool hasEntry, const Times& times, double cores, std::FILE* csv) {
    const double alone = median(times.alone) * 1e6, after = median(times.after) * 1e6;
    const double network = median(times.network) * 1e6, megabytes = static_cast<double>(bytes) * 1e-6;
    const char* entry = hasEntry ? "yes" : "no";
    std::printf("%9.0f %-5s %10.0f %9.0f %9.0f %7.2f  %.1f%s\n", megabytes, entry, network, alone, after, after / alone,
                cores, cores > 1.7 ? "" : " *");
    std::fprintf(csv, "second core,%.0f,%s,%.1f,%.1f,%.1f,%.3f,%.2f\n", megabytes, entry, network, alone, after,
                 after / alone, cores);
    std::fflush(stdout);
}

} // namespace

void measureSecondCore(const Options& options) {
    constexpr unsigned threads = 2;
    const tbb::global_control limit(tbb::global_control::max_allowed_parallelism, threads);
    const TemporaryFolder folder;
    std::printf("a parallel loop on two threads, alone and after a network's run: medians in us\n"
                "weights/MB entry    network     alone     after  /alone  cores\n");
    std::fputs("phase,weights_mb,entry,network_us,alone_us,after_us,ratio,cores_at_work\n", options.csv.get());
    Loop loop;
    for (const std::size_t bytes : {2'000'000U, 14'000'000U, 20'000'000U, 60'000'000U}) {
        for (const bool hasEntry : {false, true}) {
            const fs::path path = writeNetwork(folder.path(), bytes, hasEntry);
            const double coresBefore = coresAtWork(threads);
            Times times;
            const auto end = std::chrono::steady_clock::now() + std::chrono::duration<double>(options.seconds);
            do
                addRound(times, loop, path);
            while (std::chrono::steady_clock::now() < end);
            report(bytes, hasEntry, times, std::min(coresBefore, coresAtWork(threads)), options.csv.get());
        }
    }
}

} // namespace bench
