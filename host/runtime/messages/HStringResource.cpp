// SPDX-License-Identifier: Apache-2.0
#include "openquarn/HStringResource.h"

#include "core/apiCall.h"

#include <map>
#include <mutex>
#include <shared_mutex>
#include <string>
#include <utility>

using OpenQuarn::Operation;

namespace {

using Name = std::pair<std::string, std::string>; // plug-in id and key

struct TextTable {
    std::shared_mutex mutex;
    std::map<Name, std::string> texts;
};

TextTable& table() {
    static TextTable theTable;
    return theTable;
}

HStatus checkId(const HStringResourceId& id) {
    if (!id.pluginId().isEmpty() && !id.key().isEmpty())
        return HStatus::kSuccess;
    return {HStatus::kInvalidParameter, "a text needs a plug-in id and a key: '" + id.pluginId().asStdString() +
                                            "' and '" + id.key().asStdString() + "'"};
}

Name nameOf(const HStringResourceId& id) {
    return {id.pluginId().asStdString(), id.key().asStdString()};
}

} // namespace

HStatus HStringResource::registerString(const HStringResourceId& id) {
    return OpenQuarn::apiCall(Operation::HStringResource_registerString, [&]() -> HStatus {
        HStatus status = checkId(id);
        if (status.error())
            return status;
        TextTable& held = table();
        const std::scoped_lock lock(held.mutex);
        held.texts.insert_or_assign(nameOf(id), id.defaultText().asStdString());
        return status;
    });
}

HString HStringResource::getString(const HStringResourceId& id, HStatus& status) {
    return OpenQuarn::apiValue(Operation::HStringResource_getString, &status, HString(), [&](HStatus& s) -> HString {
        s = checkId(id);
        if (s.error())
            return {};
        TextTable& held = table();
        const std::shared_lock lock(held.mutex);
        const auto found = held.texts.find(nameOf(id));
        return found == held.texts.end() ? id.defaultText() : HString(found->second);
    });
}
