// SPDX-License-Identifier: Apache-2.0
// Keys over time, and what lies between them.
#pragma once

#include "rig/ArrayInput.h"

#include <cstddef>
#include <span>

namespace rig {

/// The numbers are those of the attribute `interpolation`.
enum class Interpolation : int {
    step = 0,   ///< the value of the key before
    linear = 1, ///< straight between two keys
    spline = 2, ///< cubic Hermite with a tangent on either side of each key
};

/// The lists that keys come from.
struct KeyHandles {
    HDataHandle times, values, inTangents, outTangents;
};

/// Two keys and a place between them, or one key.
struct KeyPlace {
    std::size_t before = 0;
    std::size_t after = 0; ///< `before` outside of the keys, and on the last one
    double fraction = 0.0; ///< 0 at `before`, 1 at `after`
    double duration = 0.0; ///< time from `before` to `after`
};

/// A list of keys, each of `components` numbers, read once and checked. For one thread at a time.
class KeyTrack {
public:
    /// `components` above 0.
    explicit KeyTrack(std::size_t components)
        : components_(components) {}

    /// Reads and checks the lists, unless they are the ones that were read last. Fails, naming list, position and
    /// value: a number that is not finite; a time that is not above the one before it; lists that are not `components`
    /// numbers a key long (the tangents count for Interpolation::spline only). Fails in the same way the next time.
    /// [eval]
    HStatus update(const KeyHandles& handles, Interpolation interpolation);

    // the rest after update() was a success

    std::size_t keyCount() const { return times_.values().size(); }
    /// There must be a key. Before the first key it is the first, from the last key on the last. [any]
    KeyPlace find(double time) const;
    /// `components` numbers of a key. [any]
    std::span<const double> value(std::size_t key) const { return part(values_, key); }
    /// One component at a place. [any]
    double sample(const KeyPlace& place, Interpolation interpolation, std::size_t component) const;

private:
    std::span<const double> part(const ArrayInput& list, std::size_t key) const {
        return {list.values().data() + key * components_, components_};
    }
    HStatus check(Interpolation interpolation) const;
    double hermite(const KeyPlace& place, std::size_t component) const;

    std::size_t components_;
    ArrayInput times_;
    ArrayInput values_;
    ArrayInput inTangents_;
    ArrayInput outTangents_;
    Interpolation checkedFor_ = Interpolation::step;
    bool isCurrent_ = false;
    HStatus status_;
};

/// The interpolation of that number; a number that stands for none is a failure. [any]
HStatus interpolationOf(int number, Interpolation& interpolation);

} // namespace rig
