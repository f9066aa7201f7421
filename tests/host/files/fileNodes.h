// SPDX-License-Identifier: Apache-2.0
// A node type with an attribute of every kind, and a data type, for tests of scene files.
#pragma once

#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"

#include <string>
#include <vector>

namespace fileNodes {

/// Registers "fileNode", of the plug-in "fileNodes", with the session that is open:
///   yes bool, small short, whole int (3), single float (0.1), real double (0.5), choice enum, unusual double
///   (infinite) narrow double, limits -10 and 10 word string (""), path string (null, used as file name), matrix
///   matrix, list doubleArray, data fileData, mesh mesh weights double array, singles float array, words string array,
///   matrices, messages, datas arrays groups compound array (title string; items double array; spot compound (x, y
///   double)) whole array inputs `weights` can be connected from `copied`, an output double array state double array
///   and note string, not storable out double output: real + single + the weights
/// A node that is made while no file is read gets "made" as its word. Its external content is `path`.
void registerTypes();

HObject create(const std::string& name);
HPlug plug(const std::string& name);
void connect(const std::string& source, const std::string& destination);
/// Data of the registered type that holds a text. One that begins with "bad" cannot be read, with "shy" not written.
HObject makeData(const std::string& text);
std::string textOf(const HObject& data);

/// While true, the nodes' functions for files throw.
extern bool throwing;

} // namespace fileNodes
