// SPDX-License-Identifier: Apache-2.0
// New places for what a node reads from outside of the scene file, as the host hands them to the node.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <cstddef>
#include <string>
#include <unordered_map>
#include <utility>
#include <vector>

/// Keys, as in the node's HExternalContentInfoTable, with the location that each is to have, in the order they were
/// added. A value: copying one copies its entries. One object is for one thread at a time.
class OPENQUARN_API HExternalContentLocationTable {
public:
    /// `location` an unresolved path; may be empty. kInvalidParameter when the key is empty, kFailure when it has an
    /// entry already; the table stays as it was. [any]
    HStatus addEntry(const HString& key, const HString& location);

    /// Number of entries. [any]
    unsigned length() const noexcept { return static_cast<unsigned>(entries_.size()); }
    /// Key of entry `index`, which counts from 0 to length() - 1; kFailure and "" beyond. [any]
    HString key(unsigned index, HStatus* status = nullptr) const;
    /// Copies the location of that key. kFailure when there is none: the node keeps what it has. [any]
    HStatus getLocation(const HString& key, HString& location) const;

private:
    std::vector<std::pair<HString, HString>> entries_;
    std::unordered_map<std::string, std::size_t> indexOf_;
};
