// SPDX-License-Identifier: Apache-2.0
// A violated thread tag ends the program with a sentence, in builds that check them.
#include "host/support/SceneTest.h"

#include <thread>

#ifndef NDEBUG

namespace {

using namespace testNodes;

class ThreadTagDeathTest : public SceneTest {
protected:
    ThreadTagDeathTest() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(ThreadTagDeathTest, MainIsTheThreadOfTheSession) {
    create("testSum", "n");
    EXPECT_DEATH(std::thread([] { plug("n.bare").setDouble(1.0); }).join(), "HPlug::setDouble was called on another");
}

TEST_F(ThreadTagDeathTest, MainIsOutsideOfAnEvaluation) {
    create("testCase", "n");
    create("testSum", "other");
    Hooks::compute = [](HPxNode&, const HPlug&, HDataBlock&) { return plug("other.bare").setDouble(1.0); };
    EXPECT_DEATH(plug("n.out").asDouble(), "HPlug::setDouble was called during an evaluation");
}

TEST_F(ThreadTagDeathTest, EvalIsAThreadThatEvaluates) {
    create("testSum", "n");
    EXPECT_DEATH(std::thread([] { plug("n.total").asDouble(); }).join(), "HPlug::asDouble was called on a thread that");
}

} // namespace

#endif
