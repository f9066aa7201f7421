// SPDX-License-Identifier: Apache-2.0
#include "harness.h"

#include "probes.h"

#include <algorithm>
#include <chrono>
#include <optional>

namespace bench {
namespace {

using Clock = std::chrono::steady_clock;

double secondsSince(Clock::time_point start) {
    return std::chrono::duration<double>(Clock::now() - start).count();
}

double quantile(std::vector<double> values, double q) {
    if (values.empty())
        return 0.0;
    const auto at = values.begin() + static_cast<std::ptrdiff_t>(q * static_cast<double>(values.size() - 1) + 0.5);
    std::nth_element(values.begin(), at, values.end());
    return *at;
}

// Code that is timed in samples long enough for the clock.
struct Candidate {
    std::function<void()> run;
    std::size_t callsPerSample = 1;
    std::vector<double> seconds; // per call, one entry a round

    explicit Candidate(std::function<void()> runIn)
        : run(std::move(runIn)) {
        run(); // warm-up: pages, caches, worker threads
        constexpr double shortestSample = 1e-3;
        for (;; callsPerSample *= 2)
            if (timeSample() > shortestSample || callsPerSample >= (1U << 20U))
                return;
    }

    double timeSample() const {
        const auto start = Clock::now();
        for (std::size_t c = 0; c < callsPerSample; ++c)
            run();
        return secondsSince(start);
    }

    // The calls before the clock starts bring back the data that another candidate drove out of the caches.
    void sample(std::size_t warmUpCalls) {
        for (std::size_t c = 0; c < warmUpCalls; ++c)
            run();
        seconds.push_back(timeSample() / static_cast<double>(callsPerSample));
    }
};

// Median over the rounds of a's time over b's.
double medianRatio(const Candidate& a, const Candidate& b) {
    std::vector<double> ratios;
    for (std::size_t i = 0; i < a.seconds.size(); ++i)
        ratios.push_back(a.seconds[i] / b.seconds[i]);
    return quantile(ratios, 0.5);
}

std::optional<Candidate> optionally(const std::function<void()>& run) {
    if (!run)
        return std::nullopt;
    return Candidate(run);
}

} // namespace

Row measure(const Phase& phase, std::size_t threads, double seconds) {
    constexpr std::size_t fewestRounds = 5;
    Row row{phase, threads};
    const double coresBefore = coresAtWork(threads);
    Candidate ours(phase.ours);
    auto plain = optionally(phase.plain), eigen = optionally(phase.eigen);
    std::optional<Triad> triadArrays;
    std::optional<Candidate> triad;
    if (phase.bytes > 0) {
        triadArrays.emplace(phase.bytes);
        triad.emplace([&] { triadArrays->run(); });
    }
    std::vector<Candidate*> inTurn{&ours};
    for (auto* yardstick : {&plain, &eigen, &triad})
        if (*yardstick)
            inTurn.push_back(&**yardstick);
    const std::size_t warmUpCalls = phase.parallel ? 3 : 0; // building takes long, and starts from cold arrays in life
    const auto start = Clock::now();
    while (ours.seconds.size() < fewestRounds || secondsSince(start) < seconds) {
        for (Candidate* candidate : inTurn)
            candidate->sample(warmUpCalls);
        std::reverse(inTurn.begin(), inTurn.end()); // nobody always comes after the same other one
    }
    const double units = static_cast<double>(phase.perCall);
    row.cores = std::min(coresBefore, coresAtWork(threads));
    row.best = quantile(ours.seconds, 0.0) / units;
    row.median = quantile(ours.seconds, 0.5) / units;
    row.spread = (quantile(ours.seconds, 0.9) - quantile(ours.seconds, 0.1)) / units / row.median;
    row.toPlain = plain ? medianRatio(ours, *plain) : 0.0;
    row.eigenToOurs = eigen ? medianRatio(*eigen, ours) : 0.0;
    row.toBandwidth = triad ? medianRatio(ours, *triad) / units : 0.0;
    return row;
}

namespace {

// A ratio, or a dash where nothing was measured.
std::string ratioText(double ratio) {
    if (ratio == 0.0)
        return "-";
    char text[32];
    std::snprintf(text, sizeof text, "%.2f", ratio);
    return text;
}

} // namespace

void Report::header() {
    std::printf("%-16s %-10s %9s %3s %9s %9s %7s %8s %8s %8s %8s  %s\n", "phase", "mesh", "vertices", "thr", "ns/vert",
                "best", "spread", "GB/s", "/plain", "Eigen/", "/limit", "cores");
    if (csv_)
        std::fputs("phase,mesh,vertices,threads,ns_per_vertex_median,ns_per_vertex_best,spread,bytes_per_vertex,"
                   "gb_per_s,ratio_to_plain_loop,eigen_over_ours,ratio_to_bandwidth_limit,cores_at_work,cores_there\n",
                   csv_);
}

void Report::add(const Row& row) {
    const double vertices = static_cast<double>(row.phase.vertices);
    const double median = row.median * 1e9 / vertices, best = row.best * 1e9 / vertices;
    const double bytes = static_cast<double>(row.phase.bytes);
    const double rate = bytes / row.median * 1e-9;
    std::printf("%-16s %-10s %9zu %3zu %9.2f %9.2f %6.0f%% %8s %8s %8s %8s  %.1f%s\n", row.phase.name.c_str(),
                row.phase.mesh.c_str(), row.phase.vertices, row.threads, median, best, 100.0 * row.spread,
                ratioText(rate).c_str(), ratioText(row.toPlain).c_str(), ratioText(row.eigenToOurs).c_str(),
                ratioText(row.toBandwidth).c_str(), row.cores, row.coresWereThere() ? "" : " *");
    std::fflush(stdout);
    if (csv_) {
        std::fprintf(csv_, "%s,%s,%zu,%zu,%.4f,%.4f,%.4f,%.1f,%.4f,%.4f,%.4f,%.4f,%.2f,%d\n", row.phase.name.c_str(),
                     row.phase.mesh.c_str(), row.phase.vertices, row.threads, median, best, row.spread,
                     bytes / vertices, rate, row.toPlain, row.eigenToOurs, row.toBandwidth, row.cores,
                     row.coresWereThere() ? 1 : 0);
        std::fflush(csv_);
    }
}

void Report::legend(const char* plain) {
    std::printf(
        "ns/vert  median per vertex (and pass); best: the fastest sample; spread: (p90 - p10) / median\n"
        "GB/s     bytes that must move over the median\n"
        "/plain   our time over that of the plain way (below 1: we are faster), which is %s\n"
        "Eigen/   the time of Eigen's row-major sparse product, on one core, over ours (above 1: we are faster)\n"
        "/limit   our time over a triad's that moves the same bytes (1: as fast as memory allows)\n"
        "cores    cores at work beside the measurement; *: they were not all there, do not quote the row\n"
        "Ratios are medians over alternating samples of one run.\n",
        plain);
}

} // namespace bench
