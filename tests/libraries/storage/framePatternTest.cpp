// SPDX-License-Identifier: Apache-2.0
#include "storage/framePattern.h"

#include <gtest/gtest.h>

namespace {

TEST(FramePattern, NamesTheFileOfAFrame) {
    const struct {
        const char* pattern;
        int frame;
        const char* name;
    } rows[] = {{"a/b.####.obj", 12, "a/b.0012.obj"},
                {"a#/b.##.obj", 123, "a#/b.123.obj"},
                {"b#.obj", -7, "b-7.obj"},
                {"####.png", -7, "-0007.png"},
                {"a/###_#.png", 12345, "a/###_12345.png"}};
    for (const auto& row : rows) {
        EXPECT_TRUE(storage::isFramePattern(row.pattern));
        EXPECT_EQ(storage::frameFile(row.pattern, row.frame), row.name);
    }
    EXPECT_FALSE(storage::isFramePattern("a#/b.obj"));
    EXPECT_EQ(storage::frameFile("a#/b.obj", 7), "a#/b.obj");
}

} // namespace
