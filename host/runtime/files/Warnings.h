// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "openquarn_app/Messages.h"

#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace OpenQuarn {

/// What was found wrong with a file, up to a number that somebody may still read.
class Warnings {
public:
    struct Found {
        std::string text;
        Severity severity; ///< warning or error
    };

    /// For what is not understood, or done in another way.
    void add(std::string text) { add({std::move(text), Severity::warning}); }
    /// For what would have been refused anywhere else, too.
    void addError(std::string text) { add({std::move(text), Severity::error}); }

    /// All of them; the last says how many more there were, and is an error when one of those is.
    std::vector<Found> take() {
        if (dropped_ > 0)
            found_.push_back({"and " + std::to_string(dropped_) + " more warnings", droppedSeverity_});
        dropped_ = 0;
        droppedSeverity_ = Severity::warning;
        return std::move(found_);
    }

private:
    void add(Found found) {
        if (found_.size() < most) {
            found_.push_back(std::move(found));
            return;
        }
        ++dropped_;
        if (found.severity == Severity::error)
            droppedSeverity_ = Severity::error;
    }

    static constexpr std::size_t most = 200;
    std::vector<Found> found_;
    std::size_t dropped_ = 0;
    Severity droppedSeverity_ = Severity::warning;
};

} // namespace OpenQuarn
