// SPDX-License-Identifier: Apache-2.0
// The name of a text that a plug-in shows to people.
#pragma once

#include "openquarn/HString.h"

#include <utility>

/// Plug-in id and key name the text; the default text is what is shown where nobody has registered another. A plain
/// value: making one registers nothing. `[any]` throughout.
class OPENQUARN_API HStringResourceId {
public:
    /// `pluginId` and `key` may not be empty when the id is used; `defaultText` may be.
    HStringResourceId(HString pluginId, HString key, HString defaultText)
        : pluginId_(std::move(pluginId))
        , key_(std::move(key))
        , defaultText_(std::move(defaultText)) {}

    const HString& pluginId() const noexcept { return pluginId_; }
    const HString& key() const noexcept { return key_; }
    const HString& defaultText() const noexcept { return defaultText_; }

private:
    HString pluginId_;
    HString key_;
    HString defaultText_;
};
