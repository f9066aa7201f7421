// SPDX-License-Identifier: Apache-2.0
// Reports on characters: figures, charts, pictures and pages.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

/// Adds a sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addReportCommand(CLI::App& app);

} // namespace quarn
