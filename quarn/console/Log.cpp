// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/Log.h"

#include "quarn/console/printable.h"
#include "storage/Descriptor.h"
#include "storage/FileError.h"
#include "storage/openToAppend.h"

#include <array>
#include <atomic>
#include <cerrno>
#include <ctime>
#include <exception>
#include <iostream>
#include <mutex>
#include <span>
#include <string_view>

#include <sys/stat.h>
#include <unistd.h>

namespace quarn {
namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

constexpr std::string_view firstWords = "quarn log, "; // of each run, and so of each file

struct State {
    std::atomic<bool> isOn{false};
    bool isVerbose = false;
    fs::path path;
    Clock::time_point begin;
    std::mutex mutex; // of the file
    storage::Descriptor file;
};

/// Never destroyed: other threads may have something to say while the process ends.
State& state() {
    static auto& theState = *new State;
    return theState;
}

std::string thousandths(long long count) {
    const std::string part = std::to_string(count % 1000);
    return std::to_string(count / 1000) + "." + std::string(3 - part.size(), '0') + part;
}

// one line, so that a name from a file does not pass for several
std::string lineOf(const std::string& sentence) {
    std::string line = printable(sentence);
    for (std::size_t at = 0; (at = line.find('\n', at)) != std::string::npos; at += 2)
        line.replace(at, 1, "\\n");
    return line + "\n";
}

std::string stamped(const std::string& sentence) {
    const auto passed = std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - state().begin);
    std::string seconds = thousandths(passed.count());
    if (seconds.size() < 8)
        seconds.insert(0, 8 - seconds.size(), ' ');
    return seconds + " s  " + lineOf(sentence);
}

void append(const std::string& line) {
    const std::scoped_lock lock(state().mutex);
    if (!state().file.isOpen())
        return;
    if (const int error = storage::writeAll(state().file.number(), std::as_bytes(std::span(line))); error != 0) {
        state().file.close();
        std::cerr << "warning: " +
                         lineOf(state().path.string() + " is not written any further: " + storage::textOfErrno(error));
    }
}

bool isSame(int descriptor, const struct stat& file) {
    struct stat other = {};
    return ::fstat(descriptor, &other) == 0 && other.st_dev == file.st_dev && other.st_ino == file.st_ino;
}

storage::Descriptor openedLog(const fs::path& path) {
    storage::Descriptor file = storage::openToAppend(path, firstWords);
    struct stat status = {};
    if (::fstat(file.number(), &status) != 0)
        storage::failToWrite(path, errno);
    const bool isAnswer = isSame(STDOUT_FILENO, status) && !isSame(STDERR_FILENO, status);
    if (isAnswer && path != "/dev/null")
        throw storage::FileError(path, "is standard output, where the answer goes: name another file for the log");
    return file;
}

std::string timeOfDay() {
    const std::time_t now = std::time(nullptr);
    std::tm parts = {};
    std::array<char, 32> text = {};
    ::gmtime_r(&now, &parts);
    return {text.data(), std::strftime(text.data(), text.size(), "%Y-%m-%dT%H:%M:%SZ", &parts)};
}

} // namespace

void Log::begin(bool verbose, const fs::path& file, int argc, const char* const* argv) {
    State& log = state();
    log.begin = Clock::now();
    log.isVerbose = verbose;
    log.path = file;
    if (!file.empty())
        log.file = openedLog(file);
    log.isOn = verbose || !file.empty();
    std::string line(firstWords);
    line += timeOfDay() + ":";
    for (const char* word : std::span(argv, static_cast<std::size_t>(argc)))
        line.append(" ").append(word);
    append(lineOf(line));
}

bool Log::isOn() noexcept {
    return state().isOn.load(std::memory_order_relaxed);
}

bool Log::isVerbose() noexcept {
    return isOn() && state().isVerbose;
}

void Log::write(const std::string& sentence) {
    const std::string line = stamped(sentence);
    if (isVerbose())
        std::cerr << line;
    append(line);
}

void Log::keep(const std::string& sentence) {
    if (isOn())
        append(stamped(sentence));
}

void Stage::begin(std::string what) {
    what_ = std::move(what);
    exceptions_ = std::uncaught_exceptions();
    begin_ = Clock::now();
    Log::write(what_);
}

Stage::~Stage() {
    if (what_.empty())
        return;
    const std::string time = millisecondsText(Clock::now() - begin_);
    const bool hasFailed = std::uncaught_exceptions() > exceptions_;
    Log::write(what_ + (hasFailed ? ": failed after " : result_.empty() ? ": " : ": " + result_ + ", ") + time);
}

std::string millisecondsText(Clock::duration duration) {
    return thousandths(std::chrono::duration_cast<std::chrono::microseconds>(duration).count()) + " ms";
}

} // namespace quarn
