// SPDX-License-Identifier: Apache-2.0
#include "KernelTest.h"

#include <bit>
#include <cmath>
#include <limits>
#include <random>

namespace {

using Doubles = KernelTest;

// Every kind of number, and those on and beside the borders between two roundings.
std::vector<double> doublesToNarrow() {
    using Float = std::numeric_limits<float>;
    std::vector<double> values{0.0,
                               1.0 / 3,
                               0x1p-149,
                               0x1p-150,
                               0x1.8p-150,
                               0x1p-151,
                               0x1.8p-149,
                               0x1.fffffep-127,
                               Float::min(),
                               Float::max(),
                               0x1.ffffffp127,
                               0x1.fffffefp127,
                               1e300,
                               std::numeric_limits<double>::min(),
                               std::numeric_limits<double>::denorm_min(),
                               std::numeric_limits<double>::infinity(),
                               std::numeric_limits<double>::quiet_NaN()};
    for (const double base : {1.0, 1.5, 0x1.fffffep0, 0x1p-126, 0x1p-140, 0x1p127})
        for (const double tie : {base + base * 0x1p-24, base + base * 0x3p-24, base + 0x1p-150, base + 0x3p-150})
            values.push_back(tie);
    std::mt19937_64 bits(3);
    Dice dice(3);
    for (int k = 0; k < 20000; ++k) {
        values.push_back(std::bit_cast<double>(std::uint64_t{bits()})); // of any size, mostly far beyond floats
        values.push_back(std::ldexp(dice.real(2.0) + 0x1p-26, static_cast<int>(dice.below(320)) - 170));
    }
    for (std::size_t k = values.size(); k-- > 0;)
        for (const double neighbour : {std::nextafter(values[k], -1e308), std::nextafter(values[k], 1e308)})
            values.insert(values.end(), {neighbour, -neighbour});
    values.resize(values.size() / 4 * 4);
    return values;
}

TEST_F(Doubles, AreRoundedLikeTheProcessorDoesWithAndWithoutThem) {
    const char* const text = "#include \"quillDoubles.clh\"\n"
                             "kernel void narrow(global float* to, global const ulong* from, uint count) {\n"
                             "    const uint i = get_global_id(0);\n"
                             "    if (i < count) vstore3(quillNarrow(from + 4 * i).xyz, i, to);\n"
                             "}\n";
    const auto values = doublesToNarrow();
    const std::size_t n = values.size() / 4;
    for (const char* options : {"", "-D NW_WITHOUT_DOUBLES"}) {
        const auto program = kernels::Program::fromText(*device(), "narrow", text,
                                                        std::string("-I ") + kernels::folder() + " " + options);
        Launch launch(program, "narrow");
        launch.output(std::vector<float>(3 * n)).input(values).value(static_cast<std::uint32_t>(n));
        const auto narrowed = launch.run<float>(n);
        std::size_t wrong = 0;
        for (std::size_t k = 0; k < narrowed.size(); ++k) {
            const double value = values[k / 3 * 4 + k % 3];
            const auto expected = static_cast<float>(value);
            if (std::fpclassify(expected) == FP_SUBNORMAL && !device()->keepsDenormals())
                continue;
            const bool isSame =
                std::isnan(value) ? std::isnan(narrowed[k])
                                  : std::bit_cast<std::uint32_t>(narrowed[k]) == std::bit_cast<std::uint32_t>(expected);
            if (!isSame && wrong++ < 5)
                ADD_FAILURE() << options << ": " << value << " gives " << narrowed[k] << " instead of " << expected;
        }
        EXPECT_EQ(wrong, 0U) << options;
    }
}

} // namespace
