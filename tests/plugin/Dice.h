// SPDX-License-Identifier: Apache-2.0
// Chance, the same on every machine and in every run.
#pragma once

#include <algorithm>
#include <cstdint>
#include <initializer_list>
#include <iterator>
#include <random>
#include <utility>
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
    template <class Points>
    Points moved(Points points, double by) {
        for (auto& p : points) {
            p.x += real(by);
            p.y += real(by);
            p.z += real(by);
        }
        return points;
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

private:
    std::mt19937 random_;
};
