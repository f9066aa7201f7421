// SPDX-License-Identifier: Apache-2.0
#include "rig/KeyAttributes.h"

#include "openquarn_helpers/AttributeMaker.h"

namespace rig {

void KeyAttributes::make(openquarn_helpers::AttributeMaker& maker) {
    keyTimes = maker.data("keyTimes", "kt", HFnData::kDoubleArray);
    keyValues = maker.data("keyValues", "kv", HFnData::kDoubleArray);
    keyInTangents = maker.data("keyInTangents", "kit", HFnData::kDoubleArray);
    keyOutTangents = maker.data("keyOutTangents", "kot", HFnData::kDoubleArray);
    interpolation = maker.choice("interpolation", "ip", {"step", "linear", "spline"}, 1);
    time = maker.real("time", "ti");
    maker.add({keyTimes, keyValues, keyInTangents, keyOutTangents, interpolation, time});
}

HStatus KeyAttributes::read(Inputs& inputs, KeyTrack& track, Interpolation& kind) const {
    const HStatus known = interpolationOf(inputs.integer(interpolation), kind);
    const KeyHandles handles{inputs.handle(keyTimes), inputs.handle(keyValues), inputs.handle(keyInTangents),
                             inputs.handle(keyOutTangents)};
    if (inputs.status().error())
        return inputs.status();
    return known.error() ? known : track.update(handles, kind);
}

} // namespace rig
