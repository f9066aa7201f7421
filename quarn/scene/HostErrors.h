// SPDX-License-Identifier: Apache-2.0
// What the host and its plug-ins say went wrong while a scene is evaluated: a deformer without its model passes its
// mesh through, says so, and computes without failing, and what comes out is not what the scene describes.
#pragma once

#include "openquarn_app/Messages.h"

#include <string>
#include <vector>

namespace quarn {

/// Keeps the errors and reports that are shown as long as it lives; warnings and notes go on to where they went before.
/// Thread: main, while nothing is evaluated; messages may come from any.
class HostErrors {
public:
    HostErrors();
    ~HostErrors();
    HostErrors(const HostErrors&) = delete;
    HostErrors& operator=(const HostErrors&) = delete;

    /// The first few errors since it was made or cleared, in one line, and the first failed call that has a reason;
    /// without an error the first failed call, which says less to a user. Empty when all went well.
    std::string text() const;
    void clear();

private:
    void take(const OpenQuarn::Message& message);

    std::vector<std::string> errors_;
    std::string report_;
    OpenQuarn::MessageSink previous_;
};

} // namespace quarn
