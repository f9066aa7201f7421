// SPDX-License-Identifier: Apache-2.0
// The coordinate space that a call reads or writes in.
#pragma once

/// `[any]`
class HSpace {
public:
    enum Space : int {
        kInvalid = 0,
        kTransform, ///< As the transformation itself moves points: its own output side.
        kObject,    ///< Local to the object, before its transformation.
        kWorld,     ///< The scene's. What has no parent has its kTransform here too.
    };
};
