// SPDX-License-Identifier: Apache-2.0
#include "quill/SharedArray.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <thread>
#include <vector>

namespace {

using quill::SharedArray;
using Floats = std::vector<float>;

Floats ramp(std::size_t count) {
    Floats values(count);
    for (std::size_t i = 0; i < count; ++i)
        values[i] = static_cast<float>(i % 97);
    return values;
}

TEST(SharedArray, IsHeldOnceWhereEveryBitIsTheSame) {
    for (const std::size_t count : {1U, 100U, 20000U}) {
        const SharedArray<float> array(ramp(count)), same(ramp(count));
        EXPECT_EQ(array.get(), ramp(count));
        EXPECT_EQ(array.data(), same.data());
        for (std::size_t i = 0; i < count; i += 1 + count / 150) {
            Floats other = ramp(count);
            other[i] += 1.0F; // at places that a quick look at the values misses
            EXPECT_EQ(SharedArray<float>(other).get(), other);
        }
        Floats longer = ramp(count);
        longer.push_back(0);
        EXPECT_NE(SharedArray<float>(longer).data(), array.data());
    }
    const SharedArray<float> zero(Floats{0.0F}), minusZero(Floats{-0.0F});
    const SharedArray<std::uint32_t> number(std::vector<std::uint32_t>{0});
    EXPECT_NE(zero.data(), minusZero.data());
    EXPECT_NE(static_cast<const void*>(zero.data()), number.data()) << "of another type";
    EXPECT_TRUE(SharedArray<float>(Floats()).empty() && SharedArray<float>().get().empty());
}

TEST(SharedArray, GoesWithItsLastOwner) {
    for (std::size_t i = 0; i < 1000; ++i) { // the list of arrays is tidied up meanwhile
        const SharedArray<float> kept(Floats{static_cast<float>(i), 1});
        SharedArray<float> gone(ramp(50 + i));
        gone = {};
        EXPECT_EQ(SharedArray<float>(ramp(50 + i)).get(), ramp(50 + i));
        EXPECT_EQ(SharedArray<float>(Floats{static_cast<float>(i), 1}).data(), kept.data());
    }
}

TEST(SharedArray, IsOneForThreadsThatMakeItAtOnce) {
    for (std::size_t round = 0; round < 50; ++round) {
        std::vector<SharedArray<float>> arrays(8);
        std::vector<std::thread> threads;
        for (SharedArray<float>& array : arrays)
            threads.emplace_back([&array, round] { array = ramp(500 + round); });
        for (std::thread& thread : threads)
            thread.join();
        for (const SharedArray<float>& array : arrays)
            EXPECT_EQ(array.data(), arrays[0].data());
    }
}

} // namespace
