// SPDX-License-Identifier: Apache-2.0
// Says that something was used.
#pragma once

#include "openquarn/Tstring.h"

/// Counts usage events, such as "a model was loaded", by their names: `Instrumenter::with("…").instrument();`. The
/// counts stay in this process, where the application can read them; nothing is stored or sent anywhere.
class OPENQUARN_API Instrumenter {
public:
    /// An object that counts events of this name. Counts nothing yet. [any]
    static Instrumenter with(const Tstring& eventName);

    /// Counts one event. An empty name counts nothing; so does a lack of memory for a new one. [any]
    void instrument() const noexcept;

private:
    explicit Instrumenter(Tstring eventName) noexcept;
    Tstring eventName_;
};
