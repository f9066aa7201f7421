// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/StepLine.h"

#include "quarn/console/Log.h"
#include "storage/Descriptor.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <iostream>
#include <regex>

#include <fcntl.h>
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

std::string endOfFile(const fs::path& path) {
    std::error_code error;
    const std::uintmax_t size = fs::file_size(path, error);
    const storage::Descriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    std::array<std::byte, 512> bytes{};
    const std::ptrdiff_t count =
        error ? 0 : storage::readAt(file.number(), size > bytes.size() ? size - bytes.size() : 0, bytes);
    std::string text;
    for (std::ptrdiff_t i = 0; i < count; ++i)
        text += static_cast<char>(bytes.at(static_cast<std::size_t>(i)));
    return text;
}

} // namespace

StepLine::StepLine(const Console& console, std::string label, fs::path log)
    : label_(std::move(label))
    , log_(std::move(log))
    , isShown_(!console.quiet && ::isatty(STDERR_FILENO) == 1 && !Log::isVerbose())
    , begin_(Clock::now())
    , drawn_(begin_) {}

StepLine::~StepLine() {
    if (isShown_)
        std::cerr << "\r\033[K" << std::flush;
}

void StepLine::draw() {
    const Clock::time_point now = Clock::now();
    if (!isShown_ || now - drawn_ < std::chrono::seconds(1))
        return;
    drawn_ = now;
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(now - begin_).count();
    std::cerr << "\r\033[K" + padded(label_) + std::to_string(seconds) + " s  " + lastCount(endOfFile(log_))
              << std::flush;
}

void StepLine::finish(const Console& console, const std::string& label, double seconds) {
    std::string number = std::to_string(std::llround(seconds * 10.0));
    number.insert(0, number.size() < 2 ? 2 - number.size() : 0, '0');
    number.insert(number.size() - 1, ".");
    console.note(padded(label) + number + " s");
}

std::string lastCount(const std::string& text) {
    static const std::regex count("[0-9]+ of [0-9]+");
    std::string last;
    for (std::sregex_iterator at(text.begin(), text.end(), count), end; at != end; ++at)
        last = at->str();
    return last;
}

} // namespace quarn
