// SPDX-License-Identifier: Apache-2.0
// A row of a report: what was measured, what the trainer says, and what is to be thought of it.
#pragma once

#include "quarn/report/measureRow.h"
#include "quarn/report/trainerFiles.h"

#include <optional>
#include <string>
#include <vector>

namespace quarn {

/// One limit, and what was found.
struct Judged {
    std::string what; ///< "mean" or "max"
    Limit limit;
    double found = 0.0; ///< in the limit's unit
    bool isKept = false;
};

/// A picture of the row, or what stands for one.
struct RowPicture {
    std::filesystem::path file;
    std::string caption;
};

struct Row {
    MeasuredRow measured;
    std::optional<TrainingRecord> training;
    std::optional<Evaluation> evaluation;
    std::vector<Judged> judged{};
    std::vector<RowPicture> pictures{};
    double pictureRange = 0.0;           ///< mm
    std::string viewer{}, whyNoViewer{}; ///< the page's file name; a sentence where there is none
    std::string whyNoPictures{};

    /// "hand, surface, principal"
    std::string label() const;
    /// Figures of a stage: "skin", "base", "basis" or "network"; none where it is not known.
    std::optional<StageFigures> figures(const std::string& stage) const;
    /// What the network leaves in parts of the better of skin and zero deltas; none where that is 0.
    std::optional<double> part(double StageFigures::*figure) const;
    bool isKept() const; ///< all limits; true without any
};

/// How far the mesh is from its target with the network, against the limits.
std::vector<Judged> judge(const Row& row, const RowRequest& request);

/// The report in a sentence: "The network takes away 93 % of the error at 0.41 ms a frame; worst 0.8 mm at thumb_root
/// (vertex 12), frame 63."
std::string sentenceOf(const MeasuredRow& row);
/// The limits in one: "Limits kept: ..."; empty without limits.
std::string verdictOf(const Row& row);

/// A length for readers: two digits, and not less than 0.01 mm: "0.83 mm", "less than 0.01 mm".
std::string lengthText(double millimetres);
/// Of a part: "93 %", "99.4 %".
std::string percentText(double part);

} // namespace quarn
