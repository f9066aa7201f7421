// SPDX-License-Identifier: Apache-2.0
// The values of a node in a scene file.
//
// They stand in an object, under the name of their plug without the node's: "width": 2, "models[3].modelName": "arm".
// Values that equal their attribute's default are left out, and so are those of plugs that are connected into, that are
// not storable, or that are outputs. The elements of an array that is no compound are runs of neighbours under the
// index of their first: "weights": {"0": [1, 0.5], "1000": [1]}. There, null is an element without a value of its own,
// as those of message arrays are. An element of an array of compounds in which everything is left out is an empty
// object: "models[3]": {}.
#pragma once

#include "files/KeptScene.h"
#include "files/Warnings.h"
#include "files/json.h"
#include "graph/Node.h"

namespace OpenQuarn {

/// Writes the key "values" with an object, or nothing when there is nothing to write. `kept` is added at its end.
void writeValues(JsonWriter& writer, const Node& node, const std::vector<KeptMember>& kept, Warnings& warnings);

/// Sets the values of a node that has just been created and is not connected yet; nobody is told. What names no plug,
/// or does not fit, goes to `kept` with a warning; a number that setAttr would refuse, with an error.
void readValues(const storage::JsonValue& values, const std::shared_ptr<Node>& node, std::vector<KeptMember>& kept,
                Warnings& warnings);

} // namespace OpenQuarn
