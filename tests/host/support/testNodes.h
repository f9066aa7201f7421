// SPDX-License-Identifier: Apache-2.0
// Small node types for tests, registered by a plug-in that lives in the test program.
#pragma once

#include "openquarn/HPxNode.h"

#include <functional>
#include <string>

namespace testNodes {

/// Registers the types below with the session that is open; unregisters them when it goes.
void registerTypes();

/// "testSum": total = scale * (sum of values) as double, rounded = the same as an int. `skip` on: total = 0, and
/// nothing else is read.
///   values  double array, connection broken: element deleted        scale  double, default 1, limits -100 and 100
///   kept    double, connection broken: keeps its value               reset  double, default 7, reset to it
///   skip    bool       text  string       matrix  matrix       choice  enum Zero, One, Five = 5, default One
///   short16, int32, single  numbers of those kinds       bare  affects nothing
///   total   double output      rounded  int output
///
/// "testLists": flat = all lists[i].items[j] in order, through an array data builder.
///   lists  compound array (items: double array; weight: double)     flat  double array output
///   note   double, affects nothing;   lists affects flat with its tree
///   shallow  compound (leaf, own: double); itself and own affect shallowOut, without its tree;  shallowOut  double
///   output
///
/// "testCase": runs Hooks::compute for its output.
///   in  double     ins  double array      out  double output     outs  double array output (in, ins affect both)
HStatus passOn(HPxNode& node, const HPlug& plug, HDataBlock& block); ///< writes out = in

struct Hooks {
    /// compute() of every "testCase" node.
    static inline std::function<HStatus(HPxNode&, const HPlug&, HDataBlock&)> compute = passOn;
    /// Called from connectionMade and connectionBroken of every "testCase" node, with "made" or "broken".
    static inline std::function<void(const char*, const HPlug&, const HPlug&, bool)> connection;
    static inline std::function<HStatus(const HPlug&, HPlugArray&)> dependents;
    static void reset() { compute = passOn, connection = nullptr, dependents = nullptr; }
};

/// A node of that type, or of any other; fails the test when there is none.
HObject create(const std::string& type, const std::string& name = {});
/// "node.plug[3].child"; null when there is no such plug.
HPlug plug(const std::string& name);
void connect(const std::string& source, const std::string& destination);
void disconnect(const std::string& source, const std::string& destination);
/// The status's text; "" for a success.
std::string text(const HStatus& status);

} // namespace testNodes
