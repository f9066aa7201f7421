// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "Settings.h"
#include "frame/PrincipalBasis.h"
#include "viewer/Blocks.h"

namespace viewer {

/// The principal shapes of the blocks basis.values and basis.scales: floats, or 16 or 8 bits of which each stands for
/// the float scale * number, rounded to single precision. Throws std::runtime_error for blocks that do not fit.
void readBasis(const Blocks& blocks, const Settings& settings, neuralWarp::PrincipalBasis& basis);

} // namespace viewer
