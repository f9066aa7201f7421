// SPDX-License-Identifier: Apache-2.0
// The attributes that both kinds of animation curves have.
#pragma once

#include "rig/Inputs.h"
#include "rig/KeyTrack.h"

namespace openquarn_helpers {
class AttributeMaker;
}

namespace rig {

struct KeyAttributes {
    HObject keyTimes;
    HObject keyValues;
    HObject keyInTangents;
    HObject keyOutTangents;
    HObject interpolation;
    HObject time;

    /// Makes and adds them; what they affect is the caller's to say. [main]
    void make(openquarn_helpers::AttributeMaker& maker);
    /// Reads the interpolation, and brings the track up to date. [eval]
    HStatus read(Inputs& inputs, KeyTrack& track, Interpolation& kind) const;
};

} // namespace rig
