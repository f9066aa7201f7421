// SPDX-License-Identifier: Apache-2.0
#include "quarn/import/posedSliders.h"

#include "quarn/scene/sliders.h"

#include <algorithm>
#include <stdexcept>

namespace quarn {
namespace {

PosedSlider sliderOf(const Character& character, const CharacterScene& scene, std::size_t mesh, std::size_t target) {
    const std::vector<HPlug> sliders = slidersOf(scene.meshes[mesh].morphs.sliders);
    const double rest = character.meshes[mesh].morphTargets[target].restWeight;
    return {mesh, target, sliderName(sliders.at(target)), {std::min(0.0, rest), std::max(1.0, rest)}};
}

// straight lines between keys do not leave what the keys are in
void widen(std::vector<PosedSlider>& sliders, const Animation& animation) {
    for (const MorphChannel& channel : animation.morphs)
        for (PosedSlider& slider : sliders)
            if (slider.mesh == channel.mesh && slider.target == channel.target)
                for (const Key<double>& key : channel.weight.keys)
                    slider.limits = {std::min(slider.limits.first, key.value),
                                     std::max(slider.limits.second, key.value)};
}

void requireSliders(const SliderLimitMap& limits, const std::vector<PosedSlider>& sliders) {
    for (const auto& [name, range] : limits) {
        std::string names;
        for (const PosedSlider& slider : sliders)
            names += (names.empty() ? "; there is " : ", ") + slider.name;
        const auto isIt = [&name = name](const PosedSlider& slider) { return slider.name == name; };
        if (std::none_of(sliders.begin(), sliders.end(), isIt))
            throw std::runtime_error("the limits name a slider \"" + name + "\" that there is not" + names);
    }
}

std::string listed(const std::vector<PosedSlider>& sliders) {
    std::string names;
    for (const PosedSlider& slider : sliders)
        names += (names.empty() ? "" : ", ") + slider.name;
    return names;
}

} // namespace

bool PosedSliders::isOf(std::size_t mesh) const {
    return std::any_of(sliders.begin(), sliders.end(), [&](const PosedSlider& slider) { return slider.mesh == mesh; });
}

bool moveWeights(const std::vector<const Animation*>& animations) {
    const auto moves = [](const MorphChannel& channel) {
        const std::vector<Key<double>>& keys = channel.weight.keys;
        return std::any_of(keys.begin(), keys.end(), [&](const auto& key) { return key.value != keys.front().value; });
    };
    return std::any_of(animations.begin(), animations.end(), [&](const Animation* animation) {
        return std::any_of(animation->morphs.begin(), animation->morphs.end(), moves);
    });
}

PosedSliders choosePosedSliders(const Character& character, const CharacterScene& scene, const SliderLimitMap* limits,
                                const std::vector<const Animation*>& animations) {
    PosedSliders posed;
    std::vector<PosedSlider> all, still, unlimited;
    for (std::size_t mesh = 0; mesh < character.meshes.size(); ++mesh)
        for (std::size_t target = 0; target < character.meshes[mesh].morphTargets.size(); ++target) {
            const PosedSlider slider = sliderOf(character, scene, mesh, target);
            all.push_back(slider);
            const bool isWanted = limits == nullptr || limits->count(slider.name) > 0;
            std::vector<PosedSlider>& list = character.meshes[mesh].morphTargets[target].vertices.empty() ? still
                                             : isWanted ? posed.sliders
                                                        : unlimited;
            list.push_back(slider);
        }
    if (limits != nullptr) {
        requireSliders(*limits, all);
        for (PosedSlider& slider : posed.sliders)
            slider.limits = limits->at(slider.name);
    } else {
        for (const Animation* animation : animations)
            widen(posed.sliders, *animation);
    }
    for (const auto& [list, reason] :
         {std::pair(&still, "morph targets that move no vertex"), std::pair(&unlimited, "sliders without limits")})
        if (!list->empty())
            posed.notes.push_back(std::string("no controls of ") + reason + ": " + listed(*list));
    return posed;
}

} // namespace quarn
