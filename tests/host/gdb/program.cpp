// SPDX-License-Identifier: Apache-2.0
// What a debugger finds: handles on a scene, all of which are there where stopHere() is called.
#include "host/support/testNodes.h"

#include "graph/plugImpl.h"
#include "openquarn/HDGModifier.h"
#include "openquarn_app/Evaluation.h"
#include "openquarn_app/Session.h"

template class OpenQuarn::SparseArray<OpenQuarn::Slot>; // all of its types are described then

namespace {

volatile int calls = 0;

[[gnu::noinline]] void stopHere() {
    calls = calls + 1;
}

} // namespace

int main() {
    const OpenQuarn::Session session;
    testNodes::registerTypes();
    const HObject node = testNodes::create("testSum", "sum1");
    const HObject gone = testNodes::create("testSum", "sum2");
    const HPlug ofGone = testNodes::plug("sum2.scale");
    HPlug value = testNodes::plug("sum1.values[3]");
    HPlug label = testNodes::plug("sum1.text");
    const HPlug total = testNodes::plug("sum1.total");
    const HPlug scale = testNodes::plug("sum1.scale");
    const HPlug values = testNodes::plug("sum1.values");
    const HPlug missing = values.elementByLogicalIndex(4);
    const HObject lists = testNodes::create("testLists", "lists1");
    const HPlug child = testNodes::plug("lists1.lists[2].weight");
    const HPlug null;
    const HObject attribute = value.attribute();
    HDGModifier modifier;
    const bool isDone = !value.setDouble(2.5).error() && !label.setString("a \"text\"").error() &&
                        !OpenQuarn::evaluate(total).error() && !value.setDouble(4.0).error() &&
                        !modifier.deleteNode(gone).error() && !modifier.doIt().error();
    stopHere();
    return isDone && null.isNull() ? 0 : 1;
}
