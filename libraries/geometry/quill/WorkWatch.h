// SPDX-License-Identifier: Apache-2.0
// Long work, and somebody who waits for it.
#pragma once

#include <cstddef>
#include <exception>
#include <functional>

namespace quill {

/// Asked and told by work that can take long. Either may be empty.
struct WorkWatch {
    /// Whether the work is to be given up: it then throws Cancelled. Asked every few milliseconds, from any of the
    /// threads that work, several at once. Must not throw.
    std::function<bool()> isCancelled = {};
    /// Hears, on the calling thread, of a polygon that is about to take long: its number in the topology, its corners,
    /// and the seconds that it may take at most, as far as can be told beforehand.
    std::function<void(std::size_t polygon, std::size_t corners, double seconds)> onSlowPolygon = {};
};

/// The work was given up because its watch said so.
struct Cancelled : std::exception {
    const char* what() const noexcept override { return "given up on request"; }
};

} // namespace quill
