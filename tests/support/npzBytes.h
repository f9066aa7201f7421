// SPDX-License-Identifier: Apache-2.0
// Archives of NumPy, as numpy.savez stores them.
#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

/// The bytes of a .npy file.
std::string npyBytes(const std::string& descr, const std::vector<std::uint64_t>& shape, const std::string& numbers);

/// The bytes of an archive of members "name.npy", with the sum of each; all of them stored, or deflated.
std::string npzBytes(const std::vector<std::pair<std::string, std::string>>& arrays, bool isDeflated = false);

/// "principal_shapes.npz" for a JSON file whose sum is `digits`, with `values` [vertices][shapes][3].
std::string shapesArchive(const std::string& digits, const std::vector<float>& values, std::uint64_t shapes);
