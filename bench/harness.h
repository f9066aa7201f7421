// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdio>
#include <functional>
#include <string>
#include <vector>

namespace bench {

// What is measured in one row: the library's own code and what it is held against, all doing the same work once per
// call. Peers that are left empty are not measured.
struct Phase {
    std::string name;
    std::string mesh;
    std::size_t vertices = 0;
    std::size_t bytes = 0;   // that must move per call at the least; 0: no bandwidth row makes sense
    std::size_t perCall = 1; // units of work (passes) in one call
    bool parallel = true;    // false: serial code, whose cores are not probed
    std::function<void()> ours{};
    std::function<void()> plain{}; // the plain loop, same loop shape
    std::function<void()> eigen{};
};

// One measured phase. Times in seconds per unit of work; ratios are medians over rounds in which the two were measured
// one right after the other.
struct Row {
    Phase phase;
    std::size_t threads = 1;
    double best = 0.0;
    double median = 0.0;
    double spread = 0.0;      // (90th - 10th percentile) / median
    double toPlain = 0.0;     // our time / the plain loop's; 0 when not measured
    double eigenToOurs = 0.0; // Eigen's time / ours
    double toBandwidth = 0.0; // our time / the triad's over the same bytes
    double cores = 0.0;       // cores at work beside the measurement, as probed before and after
    bool coresWereThere() const { return !phase.parallel || cores > 0.85 * static_cast<double>(threads); }
};

// Measures a phase on `threads` threads for about the given time, alternating with every yardstick.
Row measure(const Phase& phase, std::size_t threads, double seconds);

// Prints rows as a table on standard output, as they come, and as CSV to a file (null: none).
class Report {
public:
    explicit Report(std::FILE* csv)
        : csv_(csv) {}
    void header();
    void add(const Row& row);
    // Explains the columns. plain: what the column "/plain" is held against.
    static void legend(const char* plain);

private:
    std::FILE* csv_;
};

} // namespace bench
