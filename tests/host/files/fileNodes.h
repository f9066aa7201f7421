// SPDX-License-Identifier: Apache-2.0
// A node type with an attribute of every kind, and a data type, for tests of scene files.
#pragma once

#include "openquarn/HObject.h"

#include <string>

namespace fileNodes {

/// Registers "fileNode", of the plug-in "fileNodes", with the session that is open:
///   yes  bool     small  short     whole  int, default 3     single  float, default 0.1     choice  enum
///   real  double, default 0.5     unusual  double, default infinite     narrow  double, limits -10 and 10
///   word  string, default ""      path  string, null, a file name       matrix  matrix     list  double array data
///   data  "fileData"     mesh  mesh     weights  double array     singles  float array     words  string array
///   matrices, messages, datas  arrays     copied  double array, takes `weights` as a whole
///   groups  compound array (title: string; items: double array; spot: compound of x and y, double)
///   state  double array, and note  string, not stored     out  double output: real + single + the weights
/// A node that is made while no file is read gets "made" as its word. Its external content is `path`,
/// a pattern of files where there is a star in it.
void registerTypes();

HObject create(const std::string& name);
/// Data of the registered type that holds a text. One that begins with "bad" cannot be read, with "shy" not written,
/// and "unique" not copied; a copy holds "copy of " and the text.
HObject makeData(const std::string& text);
std::string textOf(const HObject& data);

/// While true, the nodes' functions for files throw.
extern bool throwing;

} // namespace fileNodes
