// SPDX-License-Identifier: Apache-2.0
#include "quarn/info/SliderReport.h"

#include "quarn/console/numberText.h"
#include "quarn/scene/plugs.h"
#include "quarn/scene/sliders.h"

#include <algorithm>

namespace quarn {
namespace {

std::string element(const std::string& array, unsigned index) {
    return array + "[" + std::to_string(index) + "]";
}

bool hasElement(const HPlug& array, unsigned index) {
    const std::vector<unsigned> indices = indicesOf(array);
    return std::find(indices.begin(), indices.end(), index) != indices.end();
}

// `limits`: a plug with the children minValue, maxValue and defaultValue
SliderReport reportOf(const HPlug& slider, const std::string& limits) {
    return {sliderName(slider), numberOf(findPlug(limits + ".minValue")), numberOf(findPlug(limits + ".maxValue")),
            numberOf(findPlug(limits + ".defaultValue"))};
}

// the collector's limits count before the slider's
void addCollected(const HObject& collector, std::vector<SliderReport>& reports) {
    for (const unsigned list : indicesOf(plugOf(collector, "inputList")))
        for (const unsigned value : indicesOf(plugOf(collector, element("inputList", list) + ".input"))) {
            const HPlug slider =
                sliderBehind(sourceOf(collector, element(element("inputList", list) + ".input", value)));
            if (slider.isNull())
                continue;
            const std::string array = element("limitsList", list) + ".limits";
            const bool isLimited =
                hasElement(plugOf(collector, "limitsList"), list) && hasElement(plugOf(collector, array), value);
            reports.push_back(reportOf(slider, isLimited ? nodeName(collector) + "." + element(array, value)
                                                         : std::string(slider.name().asChar())));
        }
}

} // namespace

std::vector<SliderReport> describeSliders() {
    std::vector<SliderReport> reports;
    for (const HObject& warp : nodesOfType("neuralWarp")) {
        const HPlug generator = sourceOf(warp, "poseGenerator");
        const std::string type = generator.isNull() ? "" : nodeType(generator.node());
        if (type == "controlCollector")
            addCollected(generator.node(), reports);
        else if (type == slidersType)
            for (const HPlug& slider : slidersOf(generator.node()))
                reports.push_back(reportOf(slider, slider.name().asChar()));
    }
    return reports;
}

std::string slidersText(const std::vector<SliderReport>& sliders) {
    if (sliders.empty())
        return {};
    std::string text = std::to_string(sliders.size()) + (sliders.size() == 1 ? " slider\n" : " sliders\n");
    for (const SliderReport& slider : sliders)
        text += slider.name + ": " + numberText(slider.least) + " to " + numberText(slider.most) +
                (slider.rest == 0.0 ? "" : ", default " + numberText(slider.rest)) + "\n";
    return text;
}

void writeSliders(JsonWriter& json, const std::vector<SliderReport>& sliders) {
    json.Key("sliders");
    json.StartArray();
    for (const SliderReport& slider : sliders) {
        json.StartObject();
        writeText(json, "name", slider.name);
        for (const auto& [key, value] :
             {std::pair("least", slider.least), std::pair("most", slider.most), std::pair("default", slider.rest)}) {
            json.Key(key);
            json.Double(value);
        }
        json.EndObject();
    }
    json.EndArray();
}

} // namespace quarn
