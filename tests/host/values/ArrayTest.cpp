// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HDoubleArray.h"
#include "openquarn/HFloatArray.h"
#include "openquarn/HIntArray.h"
#include "openquarn/HObjectArray.h"
#include "openquarn/HPointArray.h"
#include "openquarn/HString.h"
#include "openquarn/HStringArray.h"
#include "openquarn/HUintArray.h"
#include "openquarn/HVectorArray.h"
#include "openquarn/TapiCastAnim.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <new>
#include <numeric>
#include <stdexcept>
#include <string>
#include <vector>

namespace {

/// There is no memory for copies of it while `exhausted`.
struct Hungry {
    static inline bool exhausted = false;
    int value = 0;
    Hungry() { check(); }
    explicit Hungry(int number)
        : value(number) {}
    Hungry(const Hungry& other)
        : value(other.value) {
        check();
    }
    Hungry& operator=(const Hungry&) = default;
    ~Hungry() = default;
    bool operator==(const Hungry& other) const { return value == other.value; }
    static void check() {
        if (exhausted)
            throw std::bad_alloc();
    }
};

template <class Array>
class HostArray : public testing::Test {};
using HostArrays = testing::Types<HDoubleArray, HFloatArray, HIntArray, HUintArray, HPointArray, HVectorArray,
                                  HStringArray, HObjectArray>;
TYPED_TEST_SUITE(HostArray, HostArrays);

TYPED_TEST(HostArray, GrowsWithDefaultsAndKeepsWhatFits) {
    const auto initial = typename TypeParam::value_type();
    TypeParam array;
    EXPECT_TRUE(array.isEmpty());
    ASSERT_FALSE(array.setLength(3).error());
    ASSERT_FALSE(array.append(array[2]).error());
    EXPECT_EQ(array.length(), 4U);
    for (const auto& element : array)
        EXPECT_EQ(element, initial);

    const auto* memory = array.data();
    ASSERT_FALSE(array.setLength(1).error());
    ASSERT_FALSE(array.setLength(4).error());
    EXPECT_EQ(array.data(), memory);
    array.clear();
    EXPECT_EQ(array.begin(), array.end());
}

TYPED_TEST(HostArray, RefusesLengthsThatDoNotFitAndStaysAsItWas) {
    TypeParam array(2);
    for (const std::size_t length : {TypeParam::kMaxLength + 1, std::numeric_limits<std::size_t>::max()}) {
        for (const HStatus& status :
             {array.setLength(length), array.reserve(length), array.assign(&array[0], length)}) {
            EXPECT_EQ(status, HStatus::kInsufficientMemory);
            EXPECT_NE(status.errorString().asStdString().find(std::to_string(length)), std::string::npos);
        }
    }
    EXPECT_EQ(array.assign(nullptr, 1), HStatus::kInvalidParameter);
    EXPECT_EQ(array.length(), 2U);
    EXPECT_FALSE(array.assign(nullptr, 0).error());
    EXPECT_TRUE(array.isEmpty());
}

TEST(Array, CopiesFromMemoryAndByValue) {
    const double values[] = {1, 2, 3};
    HDoubleArray array;
    ASSERT_FALSE(array.assign(values, 3).error());
    EXPECT_EQ(array, HDoubleArray({1, 2, 3}));
    HDoubleArray copy = array;
    copy[1] = 7;
    EXPECT_EQ(array[1], 2.0);
    EXPECT_NE(copy, array);

    HStringArray texts = {"one", "two"};
    const HStringArray source = {"a", "b", "c"};
    ASSERT_FALSE(texts.assign(source.data(), 2).error());
    EXPECT_EQ(texts, HStringArray({"a", "b"}));
}

TEST(Array, AppendingTakesMemoryByDoubling) {
    HUintArray array;
    unsigned moves = 0;
    for (unsigned i = 0; i < 100000; ++i) {
        const unsigned* before = array.data();
        ASSERT_FALSE(array.append(i).error());
        moves += array.data() != before ? 1U : 0U;
    }
    EXPECT_LE(moves, 18U);
    EXPECT_EQ(std::accumulate(array.begin(), array.end(), std::uint64_t{0}), 99999ULL * 50000ULL);
    ASSERT_FALSE(array.reserve(200000).error());
    const unsigned* reserved = array.data();
    ASSERT_FALSE(array.setLength(200000).error());
    EXPECT_EQ(array.data(), reserved);
}

TEST(Array, WithoutMemoryFailsAndStaysAsItWas) {
    const std::vector<Hungry> source(3, Hungry(9));
    HArray<Hungry> array(2, Hungry(5));
    Hungry::exhausted = true;
    const std::vector<HStatus> statuses = {array.setLength(3), array.reserve(100), array.append(source[0]),
                                           array.assign(source.data(), 3)};
    Hungry::exhausted = false;
    for (const HStatus& status : statuses)
        EXPECT_EQ(status, HStatus::kInsufficientMemory);
    EXPECT_EQ(array, HArray<Hungry>(2, Hungry(5)));
}

TEST(FoundationArray, BecomesAnObjectAndIsReadBack) {
    auto* weights = new TfloatArray(8, 3);
    (*weights)[1] = 0.5F;
    auto* versions = new TuInt32Array(8, 5);
    (*versions)[4] = 0xFFFFFFFFU;
    auto* points = new T3dFltVectorArray(8, 2);
    (*points)[1] = {1, 2, 3};
    auto* frames = new T4dDblMatrixArray(8, 20);
    (*frames)[19].matrix[3][1] = 4.0;

    HStatus status = HStatus::kFailure;
    const HObject first = TapiCastAnim::convertArrayToObject(weights, &status);
    EXPECT_FALSE(status.error());
    const HObject second = TapiCastAnim::convertArrayToObject(versions);
    const HObject third = TapiCastAnim::convertArrayToObject(points);
    HObject fourth = TapiCastAnim::convertArrayToObject(frames);
    for (const HObject& object : {first, second, third, fourth})
        EXPECT_EQ(object.apiType(), HFn::kArrayObject);
    EXPECT_TRUE(first.hasFn(HFn::kData));

    ASSERT_EQ(TapiCastAnim::floatArray(first), weights);
    EXPECT_EQ(std::vector<float>(weights->begin(), weights->end()), std::vector<float>({0, 0.5F, 0}));
    ASSERT_EQ(TapiCastAnim::uInt32Array(second), versions);
    EXPECT_EQ((*versions)[4], 0xFFFFFFFFU);
    ASSERT_EQ(TapiCastAnim::floatVectorArray(third), points);
    EXPECT_EQ(points->data()[1], (T3dFltVector{1, 2, 3}));
    const HObject kept = fourth;
    fourth = HObject();
    ASSERT_EQ(TapiCastAnim::doubleMatrixArray(kept), frames);
    EXPECT_EQ((*frames)[19][3][1], 4.0);
    EXPECT_EQ(frames->length(), 20U);

    // readers answer null for anything else
    EXPECT_EQ(TapiCastAnim::floatArray(second), nullptr);
    EXPECT_EQ(TapiCastAnim::uInt32Array(first), nullptr);
    EXPECT_EQ(TapiCastAnim::floatVectorArray(first), nullptr);
    EXPECT_EQ(TapiCastAnim::doubleMatrixArray(first), nullptr);
    const HObject null = TapiCastAnim::convertArrayToObject(static_cast<TuInt32Array*>(nullptr), &status);
    EXPECT_TRUE(null.isNull());
    EXPECT_FALSE(status.error());
    EXPECT_EQ(TapiCastAnim::uInt32Array(null), nullptr);
    EXPECT_THROW(TuInt32Array(8, std::numeric_limits<std::size_t>::max()), std::length_error);
}

} // namespace
