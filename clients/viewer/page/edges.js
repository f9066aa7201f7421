// SPDX-License-Identifier: Apache-2.0
// The edges of the polygons, each once, between draw vertices.

/** `sizes`: corners of each polygon; `corners`: the draw vertex of each corner. Two numbers for each edge. */
export function edgesOf(sizes, corners, vertices) {
  const seen = new Set();
  const edges = [];
  let first = 0;
  for (const size of sizes) {
    for (let i = 0; i < size; ++i) {
      const a = corners[first + i];
      const b = corners[first + ((i + 1) % size)];
      const key = Math.min(a, b) * vertices + Math.max(a, b);
      if (seen.has(key)) continue;
      seen.add(key);
      edges.push(a, b);
    }
    first += size;
  }
  return new Uint32Array(edges);
}
