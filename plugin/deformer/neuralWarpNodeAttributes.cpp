// SPDX-License-Identifier: Apache-2.0
// The attributes of the deformer, in the order in which they are made, and what affects what.
#include "deformer/neuralWarpNode.h"
#include "messages/messageText.h"
#include "openquarn/HNodeClass.h"
#include "openquarn_helpers/AttributeMaker.h"

namespace neuralWarp {
namespace {

using openquarn_helpers::AttributeFlags;
using openquarn_helpers::AttributeMaker;
using openquarn_helpers::NumberLimits;

constexpr AttributeFlags list{.array = true};
constexpr AttributeFlags setting{.keyable = false};

/// The attributes of the node, in the shapes that it has several of.
class Maker : public AttributeMaker {
public:
    HObject text(const char* longName, const char* shortName, bool isFilename = false) {
        return data(longName, shortName, HFnData::kString, {.filename = isFilename}, HFnStringData().create(""));
    }
    HObject integer(const char* longName, const char* shortName, int defaultValue, const NumberLimits& limits = {}) {
        return number(longName, shortName, HFnNumericData::kInt, defaultValue, setting, limits);
    }
    HObject single(const char* longName, const char* shortName, float defaultValue, const NumberLimits& limits) {
        return number(longName, shortName, HFnNumericData::kFloat, static_cast<double>(defaultValue), setting, limits);
    }
    HObject onOff(const char* longName, const char* shortName, bool defaultValue) {
        return boolean(longName, shortName, defaultValue, setting);
    }
};

const HObject& filterInputGeometry() {
    static const HObject attribute = HNodeClass("geometryFilter").attribute("inputGeometry");
    return attribute;
}

} // namespace

// Whatever the host says to a step, the type comes into being with what could be made.
HStatus neuralWarpNode::initialize() {
    Maker make;
    modelRoot = make.text("modelRoot", "mlrt", true);
    modelName = make.text("modelName", "mlnm");
    modelActive = make.choice("modelActive", "mlac", {messageText(Text::kModelOff), messageText(Text::kModelOn)}, 0);
    models = make.compound("models", "models", {modelName, modelActive}, list);
    trainingDataRoot = make.text("trainingDataRoot", "tdrt", true);
    trainingDataName = make.text("trainingDataName", "tdnm");
    deltaMode = make.choice("deltaMode", "tddl",
                            {messageText(Text::kDeltaModeOffset), messageText(Text::kDeltaModeSurface)}, 1);
    smoothingIterations = make.integer("smoothingIterations", "tdsi", 0, {.min = 0, .max = 100, .softMax = 10});
    exportStartFrame = make.integer("exportStartFrame", "exsf", 1);
    exportEndFrame = make.integer("exportEndFrame", "exef", 1000);
    exportList = make.compound("export", "exp", {trainingDataName, deltaMode, smoothingIterations}, list);
    outputModelName = make.text("outputModelName", "omlnm", true);
    batchSize = make.integer("batchSize", "bs", 128, {.min = 1, .max = 100000, .softMax = 5000});
    epochs = make.integer("epochs", "ep", 250, {.min = 1, .max = 100000, .softMax = 1000});
    learningRate = make.number("learningRate", "lr", HFnNumericData::kDouble, 0.0005, setting,
                               {.min = 0, .max = 1, .softMin = 0.0001, .softMax = 0.01});
    validationRatio = make.single("validationRatio", "val", 0.2F, {.min = 0, .max = 0.99, .softMax = 0.5});
    hiddenLayerCount = make.integer("hiddenLayerCount", "hlc", 2, {.min = 1, .max = 100, .softMax = 10});
    neuronsPerLayer = make.integer("neuronsPerLayer", "npl", 512, {.min = 1, .max = 100000, .softMax = 10000});
    activationFunction = make.choice("activationFunction", "af",
                                     {messageText(Text::kActivationSigmoid), messageText(Text::kActivationTanh),
                                      messageText(Text::kActivationReLU), messageText(Text::kActivationLeakyReLU),
                                      messageText(Text::kActivationLinear)},
                                     3);
    dropoutRatio = make.single("dropoutRatio", "dor", 0.0F, {.min = 0, .max = 1});
    principalShapesEnabled = make.onOff("principalShapesEnabled", "psen", false);
    principalShapesLimit = make.integer("principalShapesLimit", "pslm", 20, {.min = 1, .max = 500, .softMax = 100});
    principalShapesAccuracy = make.single("principalShapesAccuracy", "psac", 0.8F, {.min = 0, .max = 1});
    preloadData = make.onOff("preloadData", "preld", true);
    train = make.compound("train", "trn",
                          {outputModelName, batchSize, epochs, learningRate, validationRatio, hiddenLayerCount,
                           neuronsPerLayer, activationFunction, dropoutRatio, principalShapesEnabled,
                           principalShapesLimit, principalShapesAccuracy, preloadData},
                          list);
    controlValues = make.real("controlValues", "ctlv", 0.0, list);
    targetGeometry = make.message("targetGeometry", "tg", list);
    targetMorphGeometry = make.data("targetMorphGeometry", "tmg", HFnData::kMesh, list);
    targetMorphEnabled = make.onOff("targetMorphEnabled", "tm", false);
    targetMorphEnvelope =
        make.number("targetMorphEnvelope", "tme", HFnNumericData::kDouble, 1.0, {}, {.min = 0, .max = 1});
    poseGenerator = make.message("poseGenerator", "pg");
    // the states of the geometries: nobody's to set, to save or to see
    deformerData = make.data(
        "deformerData", "dfd", neuralWarpData::id,
        {.array = true, .builder = true, .writable = false, .storable = false, .hidden = true, .indexMatters = false});

    make.add({modelRoot, trainingDataRoot, exportStartFrame, exportEndFrame, models, exportList, train, controlValues,
              targetGeometry, targetMorphGeometry, targetMorphEnabled, targetMorphEnvelope, poseGenerator,
              deformerData});

    // an edit of anything that evaluation reads deforms again; what serves training does not
    make.affects({modelActive, modelName, models, modelRoot, controlValues, targetMorphGeometry, targetMorphEnabled,
                  targetMorphEnvelope, filterInputGeometry()},
                 {outputGeom});
    make.affects({filterInputGeometry()}, {exportList, train}, true);
    return HStatus::kSuccess;
}

} // namespace neuralWarp
