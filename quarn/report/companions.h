// SPDX-License-Identifier: Apache-2.0
// What other commands make for a report: pictures by quarn render, and the page of the viewer by quarn view. Each is a
// program of its own; where one fails the report has a sentence in its place.
#pragma once

#include "quarn/report/Row.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quarn {

struct Console;

struct CompanionOptions {
    std::filesystem::path folder; ///< the report's, whole
    std::vector<std::string> plugins, renderOptions;
    std::string view;   ///< as for quarn render; empty: not given
    double range = 0.0; ///< of colours, mm; 0: a round one, from the distances before
    int pictures = 4;   ///< of each row; 0 for none
    bool hasViewer = true;
};

/// A name for files: what is neither a letter of ASCII, a digit, "-", "_" nor "." becomes "_"; a number behind it where
/// `taken` has it. Adds it to those.
std::string fileNameFor(const std::string& name, std::vector<std::string>& taken);

/// The frames that are drawn: the worst one, and others that are spread evenly, `count` in all at most.
std::vector<int> drawnFrames(const FrameRange& frames, int worst, int count);

/// Draws FOLDER/pictures/FILE.####.png, and fills in what the row knows of them. Throws Interrupted.
void addPictures(Row& row, const std::string& file, const CompanionOptions& options, const Console& console);
/// Writes FOLDER/FILE.html, likewise.
void addViewer(Row& row, const std::string& file, const CompanionOptions& options, const Console& console);

} // namespace quarn
