// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/training.h"

#include "quarn/scene/plugs.h"

#include <array>
#include <string>

namespace quarn {
namespace {

struct Setting {
    const char* attribute;
    double byDefault; // as the plug gives it
    double good;
};

constexpr std::array<Setting, 5> settings = {{
    {"batchSize", 128.0, 32.0},
    {"learningRate", 0.0005, 0.003},
    {"validationRatio", static_cast<double>(0.2F), 0.1},
    {"principalShapesAccuracy", static_cast<double>(0.8F), 0.99999},
    {"principalShapesLimit", 20.0, 200.0},
}};

} // namespace

void setGoodTraining(const HPlug& train) {
    const std::string name = train.name().asChar();
    for (const Setting& setting : settings) {
        const HPlug plug = findPlug(name + "." + setting.attribute);
        if (numberOf(plug) == setting.byDefault && !plug.isDestination())
            setNumber(plug, setting.good);
    }
}

} // namespace quarn
