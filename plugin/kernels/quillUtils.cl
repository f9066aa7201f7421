// SPDX-License-Identifier: Apache-2.0
#include "quillPoints.clh"

// One smoothing pass: each point moves towards the weighted average of its neighbours, whose divisor is their number.
//   destination, source  [count][3] distinct
//   mask                 [count] not 0: the point is pinned; null: none is
//   step                 part of the way; within 1e-5 of 1 it is the whole way
//   indexer              [count + 1] neighbours of point i: connections[indexer[i] .. indexer[i + 1])
//   connections          points; trusted
//   weights              one for each entry of connections
kernel void averageVertKernel(global float* restrict destination, global const float* restrict source,
                              global const uchar* restrict mask, float step, global const uint* restrict indexer,
                              global const uint* restrict connections, global const float* restrict weights,
                              uint count) {
    const uint i = (uint)get_global_id(0);
    if (i >= count)
        return;
    const uint first = indexer[i];
    const uint last = indexer[i + 1];
    if (first == last || (mask && mask[i])) {
        quillStore(destination, i, quillLoad(source, i));
        return;
    }
    float4 sum = 0.0f;
    for (uint k = first; k < last; ++k)
        sum += quillLoad(source, connections[k]) * weights[k];
    float4 result = sum / (float)(last - first);
    if (fabs(step - 1.0f) > 1e-5f) {
        const float4 here = quillLoad(source, i);
        result = here + (result - here) * step;
    }
    quillStore(destination, i, result);
}
