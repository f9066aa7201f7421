// SPDX-License-Identifier: Apache-2.0
// Libraries that print on standard output have their say on standard error, so that the answer stays readable.
#pragma once

namespace quarn {

/// While it lives, what anybody in the process writes to standard output goes to standard error. Thread: main.
class StdoutAside {
public:
    StdoutAside();
    ~StdoutAside();
    StdoutAside(const StdoutAside&) = delete;
    StdoutAside& operator=(const StdoutAside&) = delete;

private:
    int kept_; ///< the real standard output; -1 when there is none
};

} // namespace quarn
