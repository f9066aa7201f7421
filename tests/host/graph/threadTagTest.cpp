// SPDX-License-Identifier: Apache-2.0
// Calls on threads that may not make them: they are not carried out, and wait for nobody. A release build answers with
// a sentence, a debug build ends with it.
#include "host/support/SceneTest.h"

#include "openquarn/HDGModifier.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HGlobal.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/SceneFile.h"

#include <functional>
#include <thread>

namespace {

using namespace testNodes;
using ::testing::ElementsAre;
using ::testing::HasSubstr;

using Call = std::function<HStatus(HDataBlock&)>;
using Place = HStatus (*)(const Call&);

/// What the call answers inside of compute() of "n", of several plugs beside the others.
HStatus answerIn(const HPlugArray& plugs, const Call& call) {
    HStatus answer;
    Hooks::compute = [&](HPxNode& node, const HPlug& asked, HDataBlock& block) {
        if (node.name() == "n")
            answer = call(block);
        return block.outputValue(asked).set(1.0);
    };
    EXPECT_EQ(text(OpenQuarn::evaluate(plugs, plugs.size() > 1)), "");
    return answer;
}

HStatus inCompute(const Call& call) {
    return answerIn({plug("n.out")}, call);
}

HStatus inParallel(const Call& call) {
    return answerIn({plug("other.out"), plug("n.out")}, call);
}

/// On a thread of the node's own, for which compute() waits.
HStatus onAThreadOfCompute(const Call& call) {
    return inCompute([&](HDataBlock& block) {
        HStatus answer;
        std::thread([&] { answer = call(block); }).join();
        return answer;
    });
}

HStatus onAnotherThread(const Call& call) {
    HStatus answer;
    HDataBlock none;
    std::thread([&] { answer = call(none); }).join();
    return answer;
}

HStatus removeOther(HDataBlock&) {
    HDGModifier modifier;
    return modifier.deleteNode(plug("other.out").node());
}

HStatus readDirty(HDataBlock&) {
    HStatus status;
    plug("other.out").asDouble(&status);
    return status;
}

struct Misuse {
    Place place;
    Call call;
    const char* sentence;
};

const std::vector<Misuse>& misuses() {
    static const std::vector<Misuse> all = {
        {inCompute, [](auto&) { return plug("n.in").setDouble(9.0); },
         "HPlug::setDouble was called during an evaluation"},
        {inCompute,
         [](auto&) {
             HStatus status;
             HFnDependencyNode().create("testSum", "made", &status);
             return status;
         },
         "HFnDependencyNode::create was called during an evaluation"},
        {inCompute, [](auto&) { return OpenQuarn::evaluate(plug("other.out")); },
         "evaluate was called during an evaluation"},
        {inCompute, [](auto&) { return OpenQuarn::makeDirty(plug("other.out")); },
         "makeDirty was called during an evaluation"},
        {inCompute, [](auto&) { return HStatus(HStatus::kFailure, OpenQuarn::openScene("none.json").error); },
         "openScene was called during an evaluation"},
        {inParallel, removeOther, "HDGModifier::deleteNode was called "},
        {inParallel, [](auto&) { return HGlobal::executeCommand("file -new -force"); },
         "HGlobal::executeCommand was called "},
        {onAThreadOfCompute, readDirty, "HPlug::asDouble was called on a thread that evaluates nothing"},
        {onAThreadOfCompute,
         [](HDataBlock& block) {
             HStatus status;
             block.inputValue(plug("n.in").attribute(), &status);
             return status;
         },
         "HDataBlock::inputValue was called on a thread that evaluates nothing"},
        {onAThreadOfCompute, [](auto&) { return plug("n.in").setDouble(9.0); },
         "HPlug::setDouble was called on another thread than the main one"},
        {onAnotherThread, readDirty, "HPlug::asDouble was called on a thread that evaluates nothing"},
        {onAnotherThread, removeOther, "HDGModifier::deleteNode was called on another thread than the main one"},
        {onAnotherThread, [](auto&) { return OpenQuarn::evaluate(plug("other.out")); },
         "evaluate was called on another thread than the main one"},
    };
    return all;
}

class ThreadTagDeathTest : public SceneTest {
protected:
    ThreadTagDeathTest() {
        GTEST_FLAG_SET(death_test_style, "threadsafe");
        create("testCase", "n");
        create("testCase", "other");
    }
};

#ifdef NDEBUG

TEST_F(ThreadTagDeathTest, ACallOnTheWrongThreadIsRefusedAndChangesNothing) {
    for (const Misuse& misuse : misuses()) {
        SCOPED_TRACE(misuse.sentence);
        OpenQuarn::makeDirty(plug("n.out"));
        OpenQuarn::makeDirty(plug("other.out"));
        const HStatus answer = misuse.place(misuse.call);
        EXPECT_EQ(answer.statusCode(), HStatus::kFailure);
        EXPECT_THAT(text(answer), HasSubstr(misuse.sentence));
        EXPECT_EQ(plug("n.in").asDouble(), 0.0);
        EXPECT_EQ(session.nodeCount(), 3U);
        takeMessages(); // of openScene
    }
}

TEST_F(ThreadTagDeathTest, WhatHasNoStatusSaysSoOnceAndGivesNothing) {
    plug("n.in").setDouble(5.0);
    HDataHandle in = plug("n.in").asHDataHandle();
    for (int i = 0; i < 3; ++i)
        std::thread([&] { EXPECT_EQ(in.asDouble(), 0.0); }).join();
    EXPECT_THAT(takeMessages(),
                ElementsAre("error: HDataHandle::asDouble was called on a thread that evaluates nothing"));
    EXPECT_EQ(in.asDouble(), 5.0);
}

#else

TEST_F(ThreadTagDeathTest, ACallOnTheWrongThreadEndsTheProgram) {
    for (const Misuse& misuse : misuses())
        EXPECT_DEATH(misuse.place(misuse.call), misuse.sentence);
}

#endif

} // namespace
