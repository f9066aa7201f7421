// SPDX-License-Identifier: Apache-2.0
// What a run has done: FOLDER/run.json, as a whole after each step.
#pragma once

#include "quarn/run/FileSums.h"
#include "quarn/run/Step.h"

namespace quarn {

/// Sums of what steps were made of, and of what they made. Errors are std::runtime_error with the sentence for the
/// user. Thread: one at a time.
class Ledger {
public:
    static constexpr const char* fileName = "run.json";

    /// Reads the file of a run's folder, where there is one. Throws for what is no such file.
    explicit Ledger(const std::filesystem::path& folder);

    /// Why a step has to be done: "its input hand.glb has changed". Empty when it is done, and its outputs are as it
    /// left them. `version` is that of the program that does it.
    std::string whyToDo(const Step& step, const std::string& version);
    /// As a step is about to begin: what it is made of. Throws when an input is missing.
    void begin(const Step& step, const std::string& version);
    /// That it is done. Throws when an output is missing.
    void finish(const Step& step);
    /// Whether there is such a file in the folder, and no step that is done has left it as it is.
    bool isForeign(const std::filesystem::path& file);
    /// Of a step's arguments, inputs and version: another one for another result.
    std::string digestOf(const Step& step, const std::string& version);

private:
    using Sums = std::map<std::string, std::string>; // of files, by path
    struct Entry {
        Words words;
        std::string version;
        Sums inputs, outputs;
        bool isDone() const { return !outputs.empty(); }
    };

    void read();
    void save() const;
    Entry entryOf(const Step& step, const std::string& version);

    std::filesystem::path folder_;
    FileSums sums_;
    std::map<std::string, Entry> entries_; ///< by label
};

} // namespace quarn
