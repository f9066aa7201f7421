// SPDX-License-Identifier: Apache-2.0
// Until viewer/Network.h is there: products with matrices and sums with constants alone.
#pragma once

#include "frame/Network.h"

#include <cstdint>
#include <span>
#include <stdexcept>
#include <vector>

namespace viewer {

class Network final : public neuralWarp::Network {
public:
    Network(std::span<const std::uint32_t> words, std::span<const float> constants)
        : words_(words.begin(), words.end())
        , constants_(constants.begin(), constants.end()) {
        if (words_.size() < 6 || words_.size() != 6 + words_[1] + std::size_t{7} * words_[4])
            throw std::runtime_error("the block \"network.words\": it is cut off");
        for (std::size_t i = 0; i < words_[4]; ++i)
            if (op(i)[0] != 1 && op(i)[0] != 2)
                throw std::runtime_error("the block \"network.words\": kind " + std::to_string(op(i)[0]));
    }
    std::size_t inputCount() const { return words_[2]; }
    std::size_t outputCount() const { return words_[3]; }

    std::vector<float> run(std::span<const float> controls) override {
        std::vector<std::vector<float>> values(words_[1]);
        values[0].assign(controls.begin(), controls.end());
        for (std::size_t i = 0; i < words_[4]; ++i) {
            const std::uint32_t* at = op(i);
            std::vector<float>& out = values[at[3]];
            const std::vector<float>& in = values[at[1]];
            out.assign(words_[6 + at[3]], 0.0F);
            const float* constant = constants_.data() + at[4];
            for (std::size_t k = 0; at[0] == 1 && k < in.size(); ++k)
                for (std::size_t j = 0; j < out.size(); ++j)
                    out[j] += in[k] * constant[k * out.size() + j];
            for (std::size_t j = 0; at[0] == 2 && j < out.size(); ++j)
                out[j] = in[j] + constant[at[5] == 1 ? 0 : j];
        }
        return values[words_[5]];
    }

private:
    const std::uint32_t* op(std::size_t i) const { return words_.data() + 6 + words_[1] + 7 * i; }
    std::vector<std::uint32_t> words_;
    std::vector<float> constants_;
};

} // namespace viewer
