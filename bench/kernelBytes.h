// SPDX-License-Identifier: Apache-2.0
// Bytes that a launch of each kernel must move at the least: every value once.
#pragma once

#include <cstddef>

namespace bench {

// Points are three floats; words are indices and floats.
inline std::size_t bytesOf(std::size_t points, std::size_t words) {
    return 12 * points + 4 * words;
}

// Source and destination, the indexer; a vertex and a weight for each connection.
inline std::size_t smoothingBytes(std::size_t vertices, std::size_t connections) {
    return bytesOf(2 * vertices, vertices + 2 * connections);
}

// The basis, and the deltas.
inline std::size_t shapesBytes(std::size_t vertices, std::size_t shapes) {
    return bytesOf(vertices + vertices * shapes, 0);
}

// Output, input, smoothed points and deltas.
inline std::size_t offsetBytes(std::size_t vertices) {
    return bytesOf(4 * vertices, 0);
}

// And rest points, 16 doubles of rest frames, the indexer and the pairs.
inline std::size_t surfaceBytes(std::size_t vertices, std::size_t pairEntries) {
    return bytesOf(5 * vertices, 32 * vertices + vertices + pairEntries);
}

} // namespace bench
