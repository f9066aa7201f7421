// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/StepLine.h"

#include "quarn/console/Log.h"

#include <algorithm>
#include <cmath>
#include <iostream>

#include <unistd.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

constexpr std::size_t labelWidth = 32;

std::string padded(std::string text) {
    text.resize(std::max(labelWidth, text.size() + 1), ' ');
    return text;
}

} // namespace

StepLine::StepLine(const Console& console, RunProgress& run, std::string label, Files files)
    : run_(run)
    , label_(std::move(label))
    , files_(std::move(files))
    , isShown_(!console.quiet && ::isatty(STDERR_FILENO) == 1 && !Log::isVerbose())
    , begin_(Clock::now())
    , drawn_(begin_) {
    std::error_code error;
    fs::remove(files_.progress, error); // of one that was killed
}

StepLine::~StepLine() {
    std::error_code error;
    fs::remove(files_.progress, error);
    if (isShown_)
        std::cerr << "\r\033[K" << std::flush;
}

void StepLine::draw() {
    const Clock::time_point now = Clock::now();
    if (now - drawn_ < std::chrono::milliseconds(500))
        return;
    drawn_ = now;
    const StepCounts counts = countsIn(files_.progress, files_.log);
    run_.count(counts);
    if (!isShown_)
        return;
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(now - begin_).count();
    std::cerr << "\r\033[K" + padded(label_) + std::to_string(seconds) + " s  " + textOf(counts) << std::flush;
}

void StepLine::finish(const Console& console, const std::string& label, double seconds) {
    std::string number = std::to_string(std::llround(seconds * 10.0));
    number.insert(0, number.size() < 2 ? 2 - number.size() : 0, '0');
    number.insert(number.size() - 1, ".");
    console.note(padded(label) + number + " s");
}

} // namespace quarn
