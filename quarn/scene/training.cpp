// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/training.h"

#include "quarn/scene/plugs.h"

namespace quarn {
namespace {

struct Training {
    double accuracy;
    int limit;
};

constexpr Training byDefault{static_cast<double>(0.8F), 20};
constexpr Training good{0.99, 200};

} // namespace

void setGoodTraining(const HPlug& train) {
    const std::string name = train.name().asChar();
    const HPlug accuracy = findPlug(name + ".principalShapesAccuracy");
    const HPlug limit = findPlug(name + ".principalShapesLimit");
    const bool isUntouched = numberOf(accuracy) == byDefault.accuracy && wholeNumberOf(limit) == byDefault.limit &&
                             !accuracy.isDestination() && !limit.isDestination();
    if (!isUntouched)
        return;
    setNumber(accuracy, good.accuracy);
    setNumber(limit, good.limit);
}

} // namespace quarn
