// SPDX-License-Identifier: Apache-2.0
// What a run does, line by line, for those who ask for it with --verbose or --log: what was loaded, what was evaluated,
// what fell back, and how long each of that took. Standard output is the answer's, and gets none of it.
#pragma once

#include <chrono>
#include <filesystem>
#include <optional>
#include <string>

namespace quarn {

/// The log of the process. Off at its start; while it is off nothing is measured or put into words. Each line says how
/// long the run has taken so far, and is one line whatever the text holds. Thread: any, where nothing else is said.
class Log {
public:
    Log() = delete;

    /// Begins it, with the command line. With `verbose`, lines go to standard error; with a `file`, which counts from
    /// the current folder, also there, each at once, behind what a log that is there holds. Throws storage::FileError
    /// for a file that cannot be written, that is standard output, or that is there and no log. Thread: main.
    static void begin(bool verbose, const std::filesystem::path& file, int argc, const char* const* argv);
    static bool isOn() noexcept;
    /// Lines go to standard error: whatever redraws a line there would be in their way.
    static bool isVerbose() noexcept;

    /// A line for both.
    static void write(const std::string& sentence);
    /// A line for the file alone: what the user is told anyway.
    static void keep(const std::string& sentence);
};

/// A line that is put together only when it is read: log([&] { return "opened " + path; }).
template <class Sentence>
void log(const Sentence& sentence) {
    if (Log::isOn())
        Log::write(sentence());
}

/// A stage of the work: a line at its begin, so that a log which ends there says in what, and one at its end with the
/// time it took, and whether an exception ended it.
class Stage {
public:
    /// `what()` says what is done, as in "opening wave.json".
    template <class What>
    explicit Stage(const What& what) {
        if (Log::isOn())
            begin(what());
    }
    ~Stage();
    Stage(const Stage&) = delete;
    Stage& operator=(const Stage&) = delete;

    /// `result()` says what came of it, for the line at the end.
    template <class Result>
    void result(const Result& result) {
        if (!what_.empty())
            result_ = result();
    }

private:
    void begin(std::string what);

    std::string what_; ///< empty: nobody reads it
    std::string result_;
    int exceptions_ = 0; ///< under way at its begin
    std::chrono::steady_clock::time_point begin_;
};

/// "12.345 ms", whatever the user's locale.
std::string millisecondsText(std::chrono::steady_clock::duration duration);

} // namespace quarn
