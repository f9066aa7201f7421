// SPDX-License-Identifier: Apache-2.0
// What is in a file, a model directory or a node type.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

/// Each adds a sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addInfoCommand(CLI::App& app);
void addListAttrCommand(CLI::App& app);

} // namespace quarn
