// SPDX-License-Identifier: Apache-2.0
// What sweeps share: chance, the same on every machine and in every run, scripts, and a comparison of bits.
#pragma once

#include "openquarn/HPointArray.h"
#include "openquarn_app/Commands.h"
#include "plugin/deformer/support/modelFolder.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <iterator>
#include <random>
#include <string>
#include <vector>

class Dice {
public:
    explicit Dice(std::uint32_t seed)
        : random_(seed) {}

    unsigned below(std::size_t limit) { return static_cast<unsigned>((std::uint64_t{random_()} * limit) >> 32U); }
    bool oneIn(unsigned sides) { return below(sides) == 0; }
    template <typename T>
    T pick(std::initializer_list<T> values) {
        return *std::next(values.begin(), below(values.size()));
    }
    /// From -limit to limit, not a number that single precision has.
    double real(double limit) { return limit * (static_cast<double>(random_()) / 2147483647.5 - 1.0); }
    std::vector<float> floats(std::size_t count, double limit) {
        std::vector<float> made(count);
        std::generate(made.begin(), made.end(), [&] { return static_cast<float>(real(limit)); });
        return made;
    }
    HPointArray moved(const HPointArray& points, double by) {
        HPointArray result = points;
        for (HPoint& p : result)
            p += HVector{real(by), real(by), real(by)}; // braces: in this order
        return result;
    }
    /// `count` of the numbers below `limit`, in no order.
    std::vector<unsigned> chosen(std::size_t count, std::size_t limit) {
        std::vector<unsigned> all(limit);
        for (unsigned i = 0; i < limit; ++i) {
            all[i] = i;
            std::swap(all[i], all[below(i + std::size_t{1})]);
        }
        all.resize(count);
        return all;
    }
    /// Gives the model three controls and that many outputs: each an arbitrary constant, or one of the controls.
    void fillNetwork(ModelSpec& model, std::size_t outputs) {
        model.controls = 3;
        model.bias = floats(outputs, 0.3);
        model.weights.assign(model.controls * outputs, 0.0F);
        for (std::size_t o = 0; o < outputs; ++o) {
            if (oneIn(2))
                continue;
            model.bias[o] = 0.0F;
            model.weights[below(model.controls) * outputs + o] = 1.0F;
        }
    }

private:
    std::mt19937 random_;
};

/// The first point at which two arrays differ by a bit (all NaN count as one); the length when there is none, or when
/// they differ in length.
inline unsigned firstDifference(const HPointArray& a, const HPointArray& b) {
    const auto same = [](double x, double y) { return std::memcmp(&x, &y, sizeof x) == 0 || (x != x && y != y); };
    unsigned i = 0;
    while (i < a.length() && i < b.length() && same(a[i].x, b[i].x) && same(a[i].y, b[i].y) && same(a[i].z, b[i].z) &&
           same(a[i].w, b[i].w))
        ++i;
    return i;
}

/// Runs commands, none of which may fail, and gives the result of the last.
inline OpenQuarn::CommandValue script(const std::string& text) {
    const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(text);
    EXPECT_TRUE(outcome) << outcome.error;
    return outcome.result;
}
