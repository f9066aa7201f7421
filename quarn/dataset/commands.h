// SPDX-License-Identifier: Apache-2.0
// A scene becomes training data.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

/// Each adds a sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addExportCommand(CLI::App& app);
void addMergeCommand(CLI::App& app);

} // namespace quarn
