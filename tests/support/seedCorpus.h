// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstddef>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include <gtest/gtest.h>

/// A fuzz target's body: true when it accepted the bytes.
using FuzzBody = bool (*)(const std::uint8_t* data, std::size_t size);

/// Runs a target's seed corpus, expects every seed to be accepted or refused as its name begins, and gives the number
/// of accepted ones: a corpus of refused inputs alone would fuzz little.
inline int runSeedCorpus(const std::string& target, FuzzBody body) {
    int accepted = 0;
    for (const auto& entry : std::filesystem::directory_iterator(std::filesystem::path(NW_FUZZ_CORPUS) / target)) {
        std::ifstream file(entry.path(), std::ios::binary);
        const std::string bytes{std::istreambuf_iterator<char>(file), {}};
        const bool expected = entry.path().filename().string().starts_with("accepted_");
        EXPECT_EQ(body(reinterpret_cast<const std::uint8_t*>(bytes.data()), bytes.size()), expected) << entry.path();
        accepted += expected ? 1 : 0;
    }
    return accepted;
}
