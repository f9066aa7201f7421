// SPDX-License-Identifier: Apache-2.0
// In which state of the scene something is evaluated.
#pragma once

#include "openquarn/HApi.h"

/// The normal context is the scene as it stands at its current time. Any other context evaluates at a time of its own,
/// on data of its own: nothing of it is seen in the normal one. [any] throughout.
class OPENQUARN_API HDGContext {
public:
    /// The normal context.
    HDGContext() = default;
    /// The context of the evaluation that the calling thread is in; the normal one outside of any.
    static HDGContext current();
    bool isNormal() const { return normal_; }
    /// The time it evaluates at, in frames; for the normal context, the scene's current time.
    double time() const;

private:
    friend class OpenQuarn::Access;
    bool normal_ = true;
    double time_ = 0.0;
};
