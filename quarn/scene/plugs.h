// SPDX-License-Identifier: Apache-2.0
// Nodes and plugs by name, for code that builds or reads scenes. All throw std::runtime_error with a sentence that
// names the node or plug. Thread: main.
#pragma once

#include "openquarn/HDoubleArray.h"
#include "openquarn/HMatrix.h"
#include "openquarn/HObject.h"
#include "openquarn/HPlug.h"

#include <string>
#include <vector>

class HMatrix;

namespace quarn {

/// A name as nodes have it: characters that cannot be in one become "_". Thread: any.
std::string usableName(std::string name);
/// A new node of that type. A name that is taken gets a number; characters that cannot be in a name become "_".
HObject createNode(const std::string& type, const std::string& name);
std::string nodeName(const HObject& node);
std::string nodeType(const HObject& node);
HObject findNode(const std::string& name);
/// In order of creation.
std::vector<HObject> nodesOfType(const std::string& type);

/// "node.list[3].child".
HPlug findPlug(const std::string& name);
/// `path` the plug's name without the node's: "list[3].child".
HPlug plugOf(const HObject& node, const std::string& path);

void connect(const HPlug& source, const HPlug& destination);
/// Breaks what comes into the plug, if anything does.
void disconnectSource(const HPlug& destination);
/// The plug connected into `path` of the node; null when there is none.
HPlug sourceOf(const HObject& node, const std::string& path);

void setNumber(const HPlug& plug, double value);
void setText(const HPlug& plug, const std::string& text);
void setMatrix(const HPlug& plug, const HMatrix& matrix);
void setList(const HPlug& plug, const std::vector<double>& values);

/// Evaluate the plug; a compute that fails throws.
double numberOf(const HPlug& plug);
int wholeNumberOf(const HPlug& plug);
std::string textOf(const HPlug& plug);
HMatrix matrixOf(const HPlug& plug);
/// Of an array of numbers: the elements that exist, in order of index.
std::vector<double> numbersOf(const HPlug& array);
std::vector<unsigned> indicesOf(const HPlug& array);

} // namespace quarn
