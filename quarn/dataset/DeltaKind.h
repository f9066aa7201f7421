// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <string>

namespace quarn {

/// Which training deltas are taken, as export[i] says, and dataset.json.
struct DeltaKind {
    int mode = 1; ///< 0 Offset, 1 Surface
    int smoothingIterations = 0;

    bool isSurface() const { return mode == 1; }
    std::string code() const { return mode == 0 ? "dbp" : "dos"; } ///< of the command -vertexDeltas
    const char* label() const { return mode == 0 ? "Offset" : "Surface"; }
    std::string text() const {
        return std::string(label()) + " deltas with " + std::to_string(smoothingIterations) + " smoothing passes";
    }
    friend bool operator==(const DeltaKind& a, const DeltaKind& b) = default;
};

} // namespace quarn
