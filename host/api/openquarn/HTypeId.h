// SPDX-License-Identifier: Apache-2.0
// The number that a type of node or data has in every scene.
#pragma once

#include <cstdint>

/// A 32-bit type id; 0 is no type. Ids must be unique among everything that is loaded at the same time. `[any]`
class HTypeId {
public:
    constexpr HTypeId() = default;
    constexpr HTypeId(std::uint32_t id) // NOLINT(google-explicit-constructor): ids are written as numbers
        : id_(id) {}
    constexpr std::uint32_t id() const { return id_; }
    constexpr bool operator==(const HTypeId& other) const { return id_ == other.id_; }
    constexpr bool operator!=(const HTypeId& other) const { return id_ != other.id_; }

private:
    std::uint32_t id_ = 0;
};
