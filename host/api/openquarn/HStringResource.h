// SPDX-License-Identifier: Apache-2.0
// The texts that the plug-ins show to people, by their ids.
#pragma once

#include "openquarn/HStatus.h"
#include "openquarn/HStringResourceId.h"

/// One table a process, empty at its start. It is written when a plug-in registers its catalogue
/// (HFnPlugin::registerUIStrings), keeps its texts when the plug-in is unloaded, and may be read while it is written.
class OPENQUARN_API HStringResource {
public:
    HStringResource() = delete;

    /// Makes the default text of the id the text of its plug-in id and key. Registered again, the id gets the new text.
    /// kInvalidParameter, and nothing registered, when the plug-in id or the key is empty. [any]
    static HStatus registerString(const HStringResourceId& id);

    /// The registered text of the id's plug-in id and key; the default text that `id` carries where there is none,
    /// which is a success. `status` is written in every case: kInvalidParameter, and an empty text, when the plug-in id
    /// or the key is empty. [any]
    static HString getString(const HStringResourceId& id, HStatus& status);
};
