// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "frame/Network.h"
#include "nw_model/ModelSession.h"

namespace neuralWarp {

/// The network of a session, which outlives this and knows why there are no outputs.
class SessionNetwork final : public Network {
public:
    explicit SessionNetwork(ModelSession& session)
        : session_(session) {}
    std::vector<float> run(std::span<const float> controls) override { return session_.run(controls); }

private:
    ModelSession& session_;
};

} // namespace neuralWarp
