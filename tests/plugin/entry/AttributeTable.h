// SPDX-License-Identifier: Apache-2.0
// The attributes of a node type as attributes/*.txt say they have to be, and as they are, in the same form.
#pragma once

#include <map>
#include <string>
#include <vector>

namespace attributeTable {

/// Everything that is said of one attribute: a text for each of "short name", "type", "default", "limits", "parent",
/// and for each flag.
using Fields = std::map<std::string, std::string>;

struct Table {
    std::map<std::string, Fields> attributes; ///< by long name
    std::vector<std::string> names;           ///< long names, in order of creation; of a type they are not known
    /// Names in their order, by parent; "" for those that have none.
    std::map<std::string, std::vector<std::string>> order;
    std::vector<std::string> dependencies; ///< "FROM -> TO" or "FROM -> TO tree", in order of declaration
};

/// Reads a file. Throws std::runtime_error, with the line, when something in it is not as attributes/README.md says.
Table readTable(const std::string& path);

/// What the registered type has itself, without what it inherits.
Table tableOfType(const std::string& nodeType);

} // namespace attributeTable
