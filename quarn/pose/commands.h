// SPDX-License-Identifier: Apache-2.0
// Poses of a scene, and the shapes that its meshes shall have in them.
#pragma once

namespace CLI {
class App;
}

namespace quarn {

/// Each adds a sub-command, with a callback that does the work. What is wrong is thrown as std::runtime_error with the
/// sentence that the user reads.
void addPoseCommand(CLI::App& app);
void addTargetCommand(CLI::App& app);

} // namespace quarn
