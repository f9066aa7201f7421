// SPDX-License-Identifier: Apache-2.0
#include "quillDoubles.clh"
#include "quillVertexFrames.clh"

// deltas[m] = the sum over the shapes j of coefficients[j] * basis[m][j].
//   deltas        [slotCount][3]
//   coefficients  [shapeCount]
//   basis         [slotCount][shapeCount][3]
kernel void gpu_principal_shapes_kernel(global float* restrict deltas, global const float* restrict coefficients,
                                        global const float* restrict basis, uint shapeCount, uint slotCount) {
    const uint m = (uint)get_global_id(0);
    if (m >= slotCount)
        return;
    global const float* shapes = basis + (size_t)m * shapeCount * 3;
    float4 sum = 0.0f;
    for (uint j = 0; j < shapeCount; ++j)
        sum += coefficients[j] * quillLoad(shapes, j);
    quillStore(deltas, m, sum);
}

QuillFrame loadMatrix(global const ulong* matrices, uint i);
QuillFrame loadMatrix(global const ulong* matrices, uint i) {
    global const ulong* m = matrices + (size_t)i * 16;
    QuillFrame rows;
    rows.x = quillNarrow(m);
    rows.y = quillNarrow(m + 4);
    rows.z = quillNarrow(m + 8);
    rows.origin = quillNarrow(m + 12);
    return rows;
}

// Moves each affected vertex from its input position p to p + f * (c - p), where c is the model's position if the
// vertex has a slot, else p, then brought towards the target, and f = weight * envelope.
//   output            [vertices of the geometry][3], others keep their values
//   input             [vertices of the geometry][3]
//   current           [count][3] affected positions after smoothing
//   weights           [count]; null: all 1
//   affectMap         [count] vertex of each affected index; null: the index itself
//   deltas            [slotCount][3]; null: no model
//   slots             [count] slot of each affected index, not below slotCount for none; null: the index itself
//   framesIndexer, framesPairs, restPoints, restFramesInverse
//                     [count + 1], [pairs][2], [count][3], [count][4][4] doubles; all null: deltas are offsets
//   target            [vertices of the geometry][3]; null: no morph
kernel void gpu_apply_deltas_kernel(global float* restrict output, global const float* restrict input,
                                    global const float* restrict current, global const float* restrict weights,
                                    global const uint* restrict affectMap, float envelope,
                                    global const float* restrict deltas, global const uint* restrict slots,
                                    uint slotCount, global const uint* restrict framesIndexer,
                                    global const uint* restrict framesPairs, global const float* restrict restPoints,
                                    global const ulong* restrict restFramesInverse, global const float* restrict target,
                                    float morphEnvelope, uint count) {
    const uint i = (uint)get_global_id(0);
    if (i >= count)
        return;
    const uint g = affectMap ? affectMap[i] : i;
    const float4 p = quillLoad(input, g);
    float4 c = p;
    const uint m = slots ? slots[i] : i;
    if (deltas && m < slotCount) {
        const float4 delta = quillLoad(deltas, m);
        if (framesIndexer) {
            const float4 q = quillTransform(quillLoad(restPoints, i) + delta, loadMatrix(restFramesInverse, i));
            c = quillTransform(q, quillVertexFrame(i, framesIndexer, framesPairs, current));
        } else {
            c = quillLoad(current, i) + delta;
        }
    }
    if (target)
        c += (quillLoad(target, g) - c) * morphEnvelope;
    const float f = weights ? weights[i] * envelope : envelope;
    quillStore(output, g, p + f * (c - p));
}
