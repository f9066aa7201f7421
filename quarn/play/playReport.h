// SPDX-License-Identifier: Apache-2.0
// What `quarn play` answers.
#pragma once

#include <string>

namespace quarn {

struct PlayResult;
struct PlayPlan;

/// Lengths in millimetres: those of the scene times `metersPerUnit`, above 0. Numbers are independent of the locale.
std::string playText(const PlayResult& result, const PlayPlan& plan, double metersPerUnit);
std::string playJson(const PlayResult& result, const PlayPlan& plan, double metersPerUnit);

} // namespace quarn
