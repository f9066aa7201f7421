// SPDX-License-Identifier: Apache-2.0
// What the trainer has left: the report folder of a training, and the answer of `trainer evaluate --json`.
#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quarn {

using Facts = std::vector<std::pair<std::string, std::string>>; ///< what it is called, and what it is, as texts

/// Of a training; what a report does not say is none.
struct TrainingRecord {
    std::optional<std::int64_t> epochs, bestEpoch, seed, threads;
    std::optional<double> seconds;
    std::string device, trainer; ///< empty: unknown
    bool isInterrupted = false;
    Facts versions, settings;
    std::vector<double> training, validation; ///< losses of each epoch; `validation` empty where there are none
};

/// Reads report.json and losses.csv of the folder. Throws std::runtime_error that names the file when one is missing or
/// is not what the trainer writes. Thread: any.
TrainingRecord readTraining(const std::filesystem::path& folder);

/// Figures of distances, in mm, and where the largest is.
struct StageFigures {
    double mean = 0.0, p99 = 0.0, p9999 = 0.0, max = 0.0;
    int frame = 0;
    std::size_t vertex = 0;
};

/// What only the trainer can tell.
struct Evaluation {
    StageFigures zeroDeltas;
    std::optional<StageFigures> basis; ///< none of a model without principal shapes
};

/// Throws as readTraining(). Thread: any.
Evaluation readEvaluation(const std::filesystem::path& file);

} // namespace quarn
