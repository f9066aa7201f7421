// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "frame/PrincipalBasis.h"
#include "nw_model/PrincipalBasisFiles.h"

#include <cstddef>
#include <cstdint>
#include <span>

namespace neuralWarp {

/// Puts shapes where frames read them, as they come from their file. The basis outlives this, and is shared by whoever
/// reads once all of it has come.
class BasisSink final : public PrincipalShapesSink {
public:
    explicit BasisSink(PrincipalBasis& basis)
        : basis_(basis) {}
    void begin(std::uint64_t shapeCount, std::uint64_t vertCount, std::span<const float> scales) override;
    void append(std::span<const float> values) override { put(values); }
    void append(std::span<const std::uint16_t> halves) override { put(halves); }

private:
    template <class Number>
    void put(std::span<const Number> values) {
        basis_.set(filled_, values);
        filled_ += values.size() / (3 * basis_.shapeCount());
    }

    PrincipalBasis& basis_;
    std::size_t filled_ = 0; // slots
};

} // namespace neuralWarp
