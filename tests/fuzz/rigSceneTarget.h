// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>

/// fuzzScene() with the types of the deformer's plug-in and of quarn's rig.
bool fuzzRigScene(const std::uint8_t* data, std::size_t size);
