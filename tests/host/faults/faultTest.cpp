// SPDX-License-Identifier: Apache-2.0
// Operations that are made to fail, and work before and after it. That each goes through its own fault point and hands
// its status back is read from the sources (header_scan.sh); here are those of which that cannot be read, one for each
// way to answer, and those that no other test calls.
#include "host/support/SceneTest.h"

#include "openquarn/HArgParser.h"
#include "openquarn/HDGModifier.h"
#include "openquarn/HDoubleArray.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HSelectionList.h"

#include <functional>
#include <stdexcept>

namespace {

using namespace testNodes;
using OpenQuarn::Faults;

class FaultsTest : public SceneTest {
protected:
    FaultsTest() { create("testSum", "n"); }
};

// the status that a call writes; a call that answers with a value and fails, or with none and succeeds, is wrong
HStatus written(const std::function<bool(HStatus*)>& call) {
    HStatus status(HStatus::kNotImplemented, "the status was not written");
    return call(&status) == status.error() ? HStatus(HStatus::kNotImplemented, "answer and status differ") : status;
}

HArgParser parsed(HStatus* status = nullptr) {
    HSyntax syntax;
    syntax.addArg(HSyntax::kLong);
    syntax.addArg(HSyntax::kBoolean);
    HArgList words;
    words.addArg(7);
    words.addArg("on");
    return {syntax, words, status};
}

HStatus done(const std::function<HStatus(HDGModifier&)>& add) {
    HDGModifier modifier;
    const HStatus status = add(modifier);
    return status.error() ? status : modifier.doIt();
}

HFnNumericAttribute limited() {
    HFnNumericAttribute made;
    made.create("made", "md", HFnNumericData::kDouble);
    made.setSoftMin(3.0);
    return made;
}

TEST_F(FaultsTest, OperationsFailOnDemandAndRecover) {
    const HObject words = HFnStringData().create("words");
    const double one = 1.0;
    const std::pair<const char*, std::function<HStatus()>> rows[] = {
        {"HArray::setLength", [] { return HDoubleArray().setLength(3); }},
        {"HArray::reserve", [] { return HDoubleArray().reserve(3); }},
        {"HArray::append", [] { return HDoubleArray().append(1.0); }},
        {"HArray::assign", [&] { return HDoubleArray().assign(&one, 1); }},
        {"HFnBase::setObject", [] { return HFnDependencyNode().setObject(plug("n.text").node()); }},
        {"HFnStringData::create",
         [] { return written([](auto* s) { return !HFnStringData().create("", s).isNull(); }); }},
        {"HArgParser::HArgParser",
         [] { return written([](auto* s) { return parsed(s).commandArgumentInt(0) == 7; }); }},
        {"HArgParser::commandArgumentInt",
         [] { return written([](auto* s) { return parsed().commandArgumentInt(0, s) == 7; }); }},
        {"HArgParser::commandArgumentBool",
         [] { return written([](auto* s) { return parsed().commandArgumentBool(1, s); }); }},
        {"HFnNumericAttribute::getSoftMin",
         [] { return written([](auto* s) { return limited().getSoftMin(s) == 3; }); }},
        {"HFnEnumAttribute::fieldIndex",
         [] {
             const HFnEnumAttribute choice(plug("n.choice").attribute());
             return written([&](auto* s) { return choice.fieldIndex("Five", s) == 5; });
         }},
        {"HArrayDataHandle::HArrayDataHandle",
         [] {
             const HDataHandle values = plug("n.values").asHDataHandle();
             return written([&](auto* s) { return HArrayDataHandle(values, s).isValid(); });
         }},
        {"HDGModifier::commandToExecute", [] { return done([](auto& m) { return m.commandToExecute("ls"); }); }},
        {"HDGModifier::newPlugValue",
         [&] { return done([&](auto& m) { return m.newPlugValue(plug("n.text"), words); }); }},
        {"HDGModifier::newPlugValueString",
         [] { return done([](auto& m) { return m.newPlugValueString(plug("n.text"), "new"); }); }},
        {"HDGModifier::renameNode",
         [] { return done([](auto& m) { return m.renameNode(plug("n.text").node(), "n"); }); }},
        {"HDGModifier::doIt", [] { return done([](auto&) { return HStatus(); }); }},
    };
    for (const auto& [operation, call] : rows) {
        SCOPED_TRACE(operation);
        EXPECT_EQ(text(call()), "");
        Faults::fail(operation);
        // by this operation, and no other that it is needed for
        EXPECT_EQ(text(call()), std::string(operation) + ": failed on demand");
        EXPECT_TRUE(Faults::fired(operation));
        EXPECT_EQ(text(call()), "") << "once is once";
        Faults::clear();
    }
    EXPECT_EQ(plug("n.text").asString(), "new");
}

TEST_F(FaultsTest, CallsAreCounted) {
    Faults::fail("HPlug::asDouble", 2, 3);
    std::string failed;
    for (int call = 1; call <= 6; ++call) {
        HStatus status;
        plug("n.total").asDouble(&status);
        failed += status.error() ? std::to_string(call) : "";
        EXPECT_EQ(Faults::fired("HPlug::asDouble"), call > 1);
    }
    EXPECT_EQ(failed, "234");
    Faults::fail("HPlug::asDouble");
    Faults::clear();
    EXPECT_FALSE(Faults::fired("HPlug::asDouble"));
    HStatus status;
    plug("n.total").asDouble(&status);
    EXPECT_FALSE(status.error());
}

TEST_F(FaultsTest, WhatIsNotKnownIsRefused) {
    EXPECT_THROW(Faults::fail("HNothing::atAll"), std::invalid_argument);
    EXPECT_THROW(Faults::fired(""), std::invalid_argument);
    EXPECT_THROW(Faults::fail(Faults::operations().front(), 0), std::invalid_argument);
}

} // namespace
