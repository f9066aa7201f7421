// SPDX-License-Identifier: Apache-2.0
#include "core/apiCall.h"
#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"

#include <utility>

using OpenQuarn::apiCall;
using OpenQuarn::apiValue;
using OpenQuarn::Operation;

namespace {

using Index = std::unordered_map<std::string, std::size_t>;

std::string quoted(const HString& key) {
    return "'" + key.asStdString() + "'";
}

HStatus checkNewKey(const Index& indexOf, const HString& key) {
    if (key.isEmpty())
        return {HStatus::kInvalidParameter, "an external content entry needs a key"};
    if (indexOf.count(key.asStdString()) != 0)
        return {HStatus::kFailure, "the external content key " + quoted(key) + " has an entry already"};
    return HStatus::kSuccess;
}

template <class Entry>
void append(Index& indexOf, std::vector<Entry>& entries, const HString& key, Entry entry) {
    entries.push_back(std::move(entry));
    try {
        indexOf.emplace(key.asStdString(), entries.size() - 1);
    } catch (...) {
        entries.pop_back(); // an entry that nobody can find must not stay
        throw;
    }
}

HStatus noSuchIndex(unsigned index, std::size_t length) {
    return {HStatus::kFailure,
            "there is no external content entry " + std::to_string(index) + " of " + std::to_string(length)};
}

HStatus noSuchKey(const HString& key) {
    return {HStatus::kFailure, "there is no external content entry " + quoted(key)};
}

} // namespace

HStatus HExternalContentInfoTable::add(HExternalContentInfo info) {
    HStatus status = checkNewKey(indexOf_, info.key);
    if (!status.error()) {
        const HString key = info.key;
        append(indexOf_, entries_, key, std::move(info));
    }
    return status;
}

HStatus HExternalContentInfoTable::addUnresolvedEntry(const HString& key, const HString& unresolvedLocation,
                                                      const HString& contextNode, const HString& role) {
    return apiCall(Operation::HExternalContentInfoTable_addUnresolvedEntry, [&]() -> HStatus {
        return add({key, unresolvedLocation, {}, contextNode, role, false});
    });
}

HStatus HExternalContentInfoTable::addResolvedEntry(const HString& key, const HString& unresolvedLocation,
                                                    const HString& resolvedLocation, const HString& contextNode,
                                                    const HString& role) {
    return apiCall(Operation::HExternalContentInfoTable_addResolvedEntry, [&]() -> HStatus {
        return add({key, unresolvedLocation, resolvedLocation, contextNode, role, true});
    });
}

HString HExternalContentInfoTable::key(unsigned index, HStatus* status) const {
    return apiValue(Operation::HExternalContentInfoTable_key, status, HString(), [&](HStatus& s) -> HString {
        if (index < entries_.size())
            return entries_[index].key;
        s = noSuchIndex(index, entries_.size());
        return {};
    });
}

HStatus HExternalContentInfoTable::getInfo(const HString& key, HExternalContentInfo& info) const {
    return apiCall(Operation::HExternalContentInfoTable_getInfo, [&]() -> HStatus {
        const auto found = indexOf_.find(key.asStdString());
        if (found == indexOf_.end())
            return noSuchKey(key);
        HExternalContentInfo copy = entries_[found->second];
        info = std::move(copy);
        return HStatus::kSuccess;
    });
}

HStatus HExternalContentLocationTable::addEntry(const HString& key, const HString& location) {
    return apiCall(Operation::HExternalContentLocationTable_addEntry, [&]() -> HStatus {
        HStatus status = checkNewKey(indexOf_, key);
        if (!status.error())
            append(indexOf_, entries_, key, std::pair(key, location));
        return status;
    });
}

HString HExternalContentLocationTable::key(unsigned index, HStatus* status) const {
    return apiValue(Operation::HExternalContentLocationTable_key, status, HString(), [&](HStatus& s) -> HString {
        if (index < entries_.size())
            return entries_[index].first;
        s = noSuchIndex(index, entries_.size());
        return {};
    });
}

HStatus HExternalContentLocationTable::getLocation(const HString& key, HString& location) const {
    return apiCall(Operation::HExternalContentLocationTable_getLocation, [&]() -> HStatus {
        const auto found = indexOf_.find(key.asStdString());
        if (found == indexOf_.end())
            return noSuchKey(key);
        location = entries_[found->second].second;
        return HStatus::kSuccess;
    });
}
