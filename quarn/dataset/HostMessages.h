// SPDX-License-Identifier: Apache-2.0
// What the host says while something is evaluated.
#pragma once

#include "openquarn_app/Messages.h"

#include <string>
#include <vector>

namespace quarn {

/// Keeps the errors and reports that are shown as long as it lives; warnings and notes go on to where they went before.
/// Thread: main; messages may come from any.
class HostMessages {
public:
    HostMessages();
    ~HostMessages();
    HostMessages(const HostMessages&) = delete;
    HostMessages& operator=(const HostMessages&) = delete;

    /// The first few, in one line; empty when there was none.
    std::string failures() const;

private:
    std::vector<std::string> failures_;
    OpenQuarn::MessageSink previous_;
};

} // namespace quarn
