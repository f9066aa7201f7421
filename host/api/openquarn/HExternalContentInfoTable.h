// SPDX-License-Identifier: Apache-2.0
// What a node reads from outside of the scene file, as the node lists it for the host.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HString.h"

#include <cstddef>
#include <string>
#include <unordered_map>
#include <vector>

/// One thing outside of the scene file.
struct HExternalContentInfo {
    HString key;                ///< Names the entry within its node: the attribute's name, for a file attribute.
    HString unresolvedLocation; ///< The path as the user wrote it.
    HString resolvedLocation;   ///< The path that is read (HFileObject); empty when it has not been resolved.
    HString contextNode;        ///< Name of the node that reads it.
    HString role;               ///< What it is to the node, such as "model directory"; may be empty.
    bool isResolved = false;
};

/// The entries, in the order they were added. A value: copying one copies its entries. One object is for one thread at
/// a time.
class OPENQUARN_API HExternalContentInfoTable {
public:
    /// Adds a thing whose path has not been resolved. kInvalidParameter when the key is empty, kFailure when it has an
    /// entry already; the table stays as it was. [any]
    HStatus addUnresolvedEntry(const HString& key, const HString& unresolvedLocation, const HString& contextNode,
                               const HString& role = HString());
    /// The same, for a thing whose path has been resolved. [any]
    HStatus addResolvedEntry(const HString& key, const HString& unresolvedLocation, const HString& resolvedLocation,
                             const HString& contextNode, const HString& role = HString());

    /// Number of entries. [any]
    unsigned length() const noexcept { return static_cast<unsigned>(entries_.size()); }
    /// Key of entry `index`, which counts from 0 to length() - 1; kFailure and "" beyond. [any]
    HString key(unsigned index, HStatus* status = nullptr) const;
    /// Copies the entry of that key. kFailure when there is none; `info` stays as it was. [any]
    HStatus getInfo(const HString& key, HExternalContentInfo& info) const;

private:
    HStatus add(HExternalContentInfo info);
    std::vector<HExternalContentInfo> entries_;
    std::unordered_map<std::string, std::size_t> indexOf_;
};
