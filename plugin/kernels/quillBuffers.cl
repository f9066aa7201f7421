// SPDX-License-Identifier: Apache-2.0
// Compiled without a folder for includes.

// Gathers the affected points: affected[i] = input[map[i]].
//   affected  [count][3]
//   input     [vertices of the geometry][3]
//   map       [count] vertex of each affected index; null: the index itself
kernel void copyToAffectBuffer(global float* restrict affected, global const float* restrict input,
                               global const uint* restrict map, uint count) {
    const uint i = (uint)get_global_id(0);
    if (i >= count)
        return;
    vstore3(vload3(map ? map[i] : i, input), i, affected);
}
