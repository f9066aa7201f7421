// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/Console.h"

#include "quarn/console/Log.h"
#include "quarn/console/interrupt.h"
#include "quarn/console/printable.h"

#include <algorithm>
#include <cmath>
#include <iostream>
#include <sstream>

#include <unistd.h>

namespace quarn {
namespace {

constexpr std::size_t barWidth = 30;
constexpr auto redrawAfter = std::chrono::milliseconds(100);

} // namespace

std::string durationText(double seconds) {
    constexpr double most = 1e9; // of what somebody else's file says
    const long whole = std::lround(std::clamp(seconds, 0.0, most));
    std::ostringstream text;
    text.imbue(std::locale::classic());
    if (whole >= 60)
        text << whole / 60 << " min ";
    text << whole % 60 << " s";
    return text.str();
}

void Console::note(const std::string& sentence) const {
    if (!quiet)
        std::cerr << printable(sentence) + "\n";
    Log::keep(sentence);
}

void Console::warn(const std::string& sentence) const {
    std::cerr << "warning: " + printable(sentence) + "\n";
    Log::keep("warning: " + sentence);
}

Progress::Progress(const Console& console, std::string what, std::size_t total)
    : what_(std::move(what))
    , total_(total)
    , file_(console.progress, what_, total)
    , shown_(!console.quiet && !Log::isVerbose() && ::isatty(STDERR_FILENO) == 1)
    , started_(std::chrono::steady_clock::now())
    , drawn_(started_ - redrawAfter) {}

Progress::~Progress() {
    if (shown_)
        std::cerr << "\r\033[K" << std::flush;
}

void Progress::advance(std::size_t steps) {
    throwIfInterrupted();
    done_ += steps;
    file_.count(done_);
    if (shown_ && std::chrono::steady_clock::now() - drawn_ >= redrawAfter)
        draw();
}

void Progress::draw() {
    drawn_ = std::chrono::steady_clock::now();
    const double part = static_cast<double>(done_) / static_cast<double>(total_);
    const auto filled = static_cast<std::size_t>(part * static_cast<double>(barWidth));
    const double elapsed = std::chrono::duration<double>(drawn_ - started_).count();
    std::string line =
        "\r\033[K" + what_ + " [" + std::string(filled, '#') + std::string(barWidth - filled, '.') + "] ";
    line += std::to_string(done_) + "/" + std::to_string(total_);
    if (done_ > 0)
        line += ", " + durationText(elapsed / part - elapsed) + " left";
    std::cerr << line << std::flush;
}

} // namespace quarn
