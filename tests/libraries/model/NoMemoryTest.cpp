// SPDX-License-Identifier: Apache-2.0
// What is promised for the moment when memory runs out: this program's operator new refuses what is large.
#include <cstdint>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "nw_model/ModelSession.h"
#include "support.h"
#include "support/watchedNew.h"

using namespace neuralWarp;
using testing::IsEmpty;

namespace {

constexpr std::size_t count = 3000;

/// Refuses arrays of `count` four-byte elements, and larger ones, while it lives.
struct NoLargeArrays {
    NoLargeArrays() {
        watch.threshold = count * 4;
        watch.refusesAll = true;
    }
    ~NoLargeArrays() { watch = {}; }
};

std::string numbers() {
    std::string text = "[1";
    for (std::size_t i = 1; i < count; ++i) {
        text += ",1";
    }
    return text + "]";
}

} // namespace

TEST(NoMemory, RunGivesAnEmptyResult) {
    ModelSession session;
    session.load(testModel("wide"), true);
    const std::vector<float> inputs = {1};
    {
        const NoLargeArrays limit;
        EXPECT_THAT(session.run(inputs), IsEmpty());
    }
    EXPECT_EQ(session.errorText(), "std::bad_alloc");
    EXPECT_EQ(session.run(inputs).size(), count);
}

TEST(NoMemory, ReadersRefuseTheirFiles) {
    const TestFolder folder;
    const auto path =
        folder.write("file.json", R"({"principalShapeCount": 1, "principalVertCount": 1000, "principalShapes": [)" +
                                      numbers() + R"(], "affectMap": )" + numbers() + "}");
    {
        const NoLargeArrays limit;
        expectRefused(path, "Error: " + path.string() + ": out of memory\n");
    }
    expectAccepted(path);
}
