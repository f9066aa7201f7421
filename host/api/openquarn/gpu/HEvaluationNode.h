// SPDX-License-Identifier: Apache-2.0
// A node as the GPU pipeline evaluates it.
#pragma once

#include "openquarn/HApi.h"
#include "openquarn/HObject.h"

#include <utility>

/// `[eval]` throughout.
class OPENQUARN_API HEvaluationNode {
public:
    explicit HEvaluationNode(HObject node)
        : node_(std::move(node)) {}
    HObject dependencyNode() const { return node_; }

private:
    HObject node_;
};
