// SPDX-License-Identifier: Apache-2.0
// A deformed mesh as one HTML file that shows it.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

/// Adds the sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addViewCommand(CLI::App& app);

} // namespace quarn
