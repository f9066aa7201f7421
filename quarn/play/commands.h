// SPDX-License-Identifier: Apache-2.0
// A scene frame by frame, timed, compared and written.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

/// Each adds a sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addPlayCommand(CLI::App& app);
void addBakeCommand(CLI::App& app);

} // namespace quarn
