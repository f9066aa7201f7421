// SPDX-License-Identifier: Apache-2.0
// Which joints drive a deformer, and how far they may turn.
#pragma once

#include "quarn/character/Character.h"
#include "quarn/import/jsonFiles.h"
#include "quarn/import/restPose.h"

#include <string>
#include <vector>

namespace quarn {

struct PosedJoint {
    std::size_t joint = 0; ///< index into Character::joints
    JointLimits limits;    ///< at least one
};

struct PoseChoice {
    const LimitMap* limits = nullptr;         ///< of the user; null without
    std::vector<const Animation*> animations; ///< where limits come from without those
    double framesPerSecond = 24.0;
    bool withRoots = false; ///< also joints without parent that have children
    double margin = 0.0;    ///< added on both sides of what animations do, in parts of the range
    bool hasOthers = false; ///< animations move other controls: joints that they do not turn are to stay
};

struct PosedJoints {
    std::vector<PosedJoint> joints; ///< by rising index
    std::vector<std::string> notes; ///< where limits come from; which joints were left out, and why
};

/// The joints whose turning a deformer has to know of. Limits are the user's, who also chooses the joints by them; or
/// else the range of angles of the animations, with 0 in it, and the margin; or else, where these move nothing that is
/// a control, 30 degrees to both sides. Left out
/// are joints that would give controls that never change, or change nothing: those below which no vertex is moved,
/// those that are not turned about any axis, those of scale 0, and roots, which place the whole character, unless
/// `withRoots` or the user's limits ask for them. Throws std::runtime_error, naming it, for a joint of the limits that
/// there is not.
PosedJoints choosePosedJoints(const Character& character, const std::vector<JointRest>& rests,
                              const PoseChoice& choice);

} // namespace quarn
