// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "plugin/Dice.h"
#include "plugin/kernels/OpenCl.h"

#include "quill/val3.h"

#include <gtest/gtest.h>

#include <cstring>
#include <memory>
#include <string>
#include <vector>

using Points = std::vector<quill::val3<float>>;
using Indices = std::vector<std::uint32_t>;

// Tests that need a device; without one they are skipped.
class KernelTest : public testing::Test {
public:
    static const kernels::Device* device() {
        static const std::unique_ptr<kernels::Device> first = kernels::Device::first();
        return first.get();
    }

protected:
    void SetUp() override {
        if (!device())
            GTEST_SKIP() << "there is no OpenCL device";
    }
};

// One launch of a kernel: its arguments in order, one of which is written. Whatever else the kernel writes fails the
// test.
class Launch {
public:
    Launch(const kernels::Program& program, const char* name)
        : kernel_(program.kernel(name))
        , arguments_(kernel_.get()) {}

    template <typename T>
    Launch& output(const std::vector<T>& before) {
        output_ = buffers_.size();
        return input(&before);
    }
    template <typename T>
    Launch& input(const std::vector<T>* contents) { // null: a null buffer
        buffers_.push_back(contents ? std::make_unique<kernels::Buffer>(*KernelTest::device(), *contents) : nullptr);
        arguments_.add(buffers_.back().get());
        return *this;
    }
    template <typename T>
    Launch& input(const std::vector<T>& contents) {
        return input(&contents);
    }
    template <typename T>
    Launch& value(T scalar) {
        arguments_.add(scalar);
        return *this;
    }
    template <typename T>
    Launch& absent() {
        return input(static_cast<const std::vector<T>*>(nullptr));
    }

    // What the kernel leaves in its output after n work items and those that fill the last group.
    template <typename T = quill::val3<float>>
    std::vector<T> run(std::size_t n, std::size_t local = 64) {
        kernels::enqueue(*KernelTest::device(), kernel_.get(), n, local);
        kernels::finish(*KernelTest::device());
        for (std::size_t b = 0; b < buffers_.size(); ++b)
            if (buffers_[b]) {
                EXPECT_TRUE(buffers_[b]->guardsAreWhole()) << "buffer " << b;
                EXPECT_TRUE(b == output_ || buffers_[b]->isUnchanged()) << "buffer " << b;
            }
        return buffers_[output_]->read<T>();
    }

private:
    kernels::Owned<cl_kernel> kernel_;
    kernels::Arguments arguments_;
    std::vector<std::unique_ptr<kernels::Buffer>> buffers_;
    std::size_t output_ = 0;
};

// Same bits; with a limit above 0, components may differ by so much instead.
inline testing::AssertionResult same(const Points& actual, const Points& expected, float limit = 0.0F) {
    if (actual.size() != expected.size())
        return testing::AssertionFailure() << actual.size() << " points instead of " << expected.size();
    for (std::size_t i = 0; i < actual.size(); ++i) {
        const quill::val3<float> d = actual[i] - expected[i];
        const bool isNear = std::abs(d.x) <= limit && std::abs(d.y) <= limit && std::abs(d.z) <= limit;
        if (limit > 0.0F ? !isNear : std::memcmp(&actual[i], &expected[i], sizeof actual[i]) != 0)
            return testing::AssertionFailure() << "point " << i << ": " << actual[i] << " instead of " << expected[i];
    }
    return testing::AssertionSuccess();
}

// 0 on a device whose quotients and roots are the processor's.
inline float roundingLimit() {
    return KernelTest::device()->isExact() ? 0.0F : 2e-5F;
}

inline Points randomPoints(Dice& dice, std::size_t count) {
    Points points(count);
    for (auto& p : points) {
        const std::vector<float> xyz = dice.floats(3, 2.0);
        p = {xyz[0], xyz[1], xyz[2]};
    }
    return points;
}

// Around the sizes of work groups.
inline const std::vector<std::size_t> oddSizes{1, 63, 64, 65, 1000};

// Triangles side by side over n vertices, the last two of which (all, below 5) belong to none.
inline std::vector<std::vector<std::uint32_t>> strip(std::size_t n) {
    std::vector<std::vector<std::uint32_t>> polygons;
    for (std::uint32_t i = 0; i + 4 < n; ++i)
        polygons.push_back({i, i + 1, i + 2});
    return polygons;
}
