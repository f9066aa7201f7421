// SPDX-License-Identifier: Apache-2.0
// The attributes of the deformer, in the order in which they are made, and what affects what.
#include "deformer/neuralWarpNode.h"
#include "messages/messageText.h"
#include "openquarn/HFnAttribute.h"
#include "openquarn/HNodeClass.h"

#include <initializer_list>
#include <optional>

namespace neuralWarp {
namespace {

struct Limits {
    std::optional<double> min = {}, max = {}, softMin = {}, softMax = {};
};

HObject makeString(const char* longName, const char* shortName, bool isFilename = false) {
    HFnTypedAttribute attribute;
    HObject made = attribute.create(longName, shortName, HFnData::kString, HFnStringData().create(""));
    if (isFilename)
        attribute.setUsedAsFilename(true);
    return made;
}

HObject makeNumber(const char* longName, const char* shortName, HFnNumericData::Type type, double defaultValue,
                   const Limits& limits = {}, bool keyable = false) {
    HFnNumericAttribute attribute;
    HObject made = attribute.create(longName, shortName, type, defaultValue);
    if (limits.min)
        attribute.setMin(*limits.min);
    if (limits.max)
        attribute.setMax(*limits.max);
    if (limits.softMin)
        attribute.setSoftMin(*limits.softMin);
    if (limits.softMax)
        attribute.setSoftMax(*limits.softMax);
    attribute.setKeyable(keyable);
    return made;
}

HObject makeInt(const char* longName, const char* shortName, int defaultValue, const Limits& limits = {}) {
    return makeNumber(longName, shortName, HFnNumericData::kInt, defaultValue, limits);
}

HObject makeFloat(const char* longName, const char* shortName, float defaultValue, const Limits& limits) {
    return makeNumber(longName, shortName, HFnNumericData::kFloat, static_cast<double>(defaultValue), limits);
}

HObject makeBool(const char* longName, const char* shortName, bool defaultValue) {
    return makeNumber(longName, shortName, HFnNumericData::kBoolean, defaultValue ? 1.0 : 0.0);
}

/// The labels stand for 0, 1, 2 ...
HObject makeEnum(const char* longName, const char* shortName, short defaultValue, std::initializer_list<Text> labels) {
    HFnEnumAttribute attribute;
    HObject made = attribute.create(longName, shortName, defaultValue);
    short value = 0;
    for (const Text label : labels)
        attribute.addField(messageText(label), value++);
    return made;
}

/// An array that can be read and written.
HObject makeCompoundArray(const char* longName, const char* shortName, std::initializer_list<HObject> children) {
    HFnCompoundAttribute attribute;
    HObject made = attribute.create(longName, shortName);
    for (const HObject& child : children)
        attribute.addChild(child);
    attribute.setArray(true);
    attribute.setReadable(true);
    attribute.setWritable(true);
    return made;
}

HObject makeMessage(const char* longName, const char* shortName, bool isArray) {
    HFnMessageAttribute attribute;
    HObject made = attribute.create(longName, shortName);
    if (isArray)
        attribute.setArray(true);
    return made;
}

HObject makeControlValues() {
    HFnNumericAttribute attribute;
    HObject made = attribute.create("controlValues", "ctlv", HFnNumericData::kDouble, 0.0);
    attribute.setKeyable(true);
    attribute.setArray(true);
    return made;
}

HObject makeMeshArray(const char* longName, const char* shortName) {
    HFnTypedAttribute attribute;
    HObject made = attribute.create(longName, shortName, HFnData::kMesh);
    attribute.setArray(true);
    attribute.setReadable(true);
    attribute.setWritable(true);
    return made;
}

/// The states of the geometries: nobody's to set, to save or to see.
HObject makeDeformerData() {
    HFnTypedAttribute attribute;
    HObject made = attribute.create("deformerData", "dfd", neuralWarpData::id);
    attribute.setArray(true);
    attribute.setStorable(false);
    attribute.setReadable(true);
    attribute.setWritable(false);
    attribute.setIndexMatters(false);
    attribute.setUsesArrayDataBuilder(true);
    attribute.setHidden(true);
    return made;
}

const HObject& filterInputGeometry() {
    static const HObject attribute = HNodeClass("geometryFilter").attribute("inputGeometry");
    return attribute;
}

} // namespace

HStatus neuralWarpNode::initialize() {
    modelRoot = makeString("modelRoot", "mlrt", true);
    modelName = makeString("modelName", "mlnm");
    modelActive = makeEnum("modelActive", "mlac", 0, {Text::kModelOff, Text::kModelOn});
    models = makeCompoundArray("models", "models", {modelName, modelActive});
    trainingDataRoot = makeString("trainingDataRoot", "tdrt", true);
    trainingDataName = makeString("trainingDataName", "tdnm");
    deltaMode = makeEnum("deltaMode", "tddl", 1, {Text::kDeltaModeOffset, Text::kDeltaModeSurface});
    smoothingIterations = makeInt("smoothingIterations", "tdsi", 0, {.min = 0, .max = 100, .softMax = 10});
    exportStartFrame = makeInt("exportStartFrame", "exsf", 1);
    exportEndFrame = makeInt("exportEndFrame", "exef", 1000);
    exportList = makeCompoundArray("export", "exp", {trainingDataName, deltaMode, smoothingIterations});
    outputModelName = makeString("outputModelName", "omlnm", true);
    batchSize = makeInt("batchSize", "bs", 128, {.min = 1, .max = 100000, .softMax = 5000});
    epochs = makeInt("epochs", "ep", 250, {.min = 1, .max = 100000, .softMax = 1000});
    learningRate = makeNumber("learningRate", "lr", HFnNumericData::kDouble, 0.0005,
                              {.min = 0, .max = 1, .softMin = 0.0001, .softMax = 0.01});
    validationRatio = makeFloat("validationRatio", "val", 0.2F, {.min = 0, .max = 0.99, .softMax = 0.5});
    hiddenLayerCount = makeInt("hiddenLayerCount", "hlc", 2, {.min = 1, .max = 100, .softMax = 10});
    neuronsPerLayer = makeInt("neuronsPerLayer", "npl", 512, {.min = 1, .max = 100000, .softMax = 10000});
    activationFunction = makeEnum("activationFunction", "af", 3,
                                  {Text::kActivationSigmoid, Text::kActivationTanh, Text::kActivationReLU,
                                   Text::kActivationLeakyReLU, Text::kActivationLinear});
    dropoutRatio = makeFloat("dropoutRatio", "dor", 0.0F, {.min = 0, .max = 1});
    principalShapesEnabled = makeBool("principalShapesEnabled", "psen", false);
    principalShapesLimit = makeInt("principalShapesLimit", "pslm", 20, {.min = 1, .max = 500, .softMax = 100});
    principalShapesAccuracy = makeFloat("principalShapesAccuracy", "psac", 0.8F, {.min = 0, .max = 1});
    preloadData = makeBool("preloadData", "preld", true);
    train = makeCompoundArray("train", "trn",
                              {outputModelName, batchSize, epochs, learningRate, validationRatio, hiddenLayerCount,
                               neuronsPerLayer, activationFunction, dropoutRatio, principalShapesEnabled,
                               principalShapesLimit, principalShapesAccuracy, preloadData});
    controlValues = makeControlValues();
    targetGeometry = makeMessage("targetGeometry", "tg", true);
    targetMorphGeometry = makeMeshArray("targetMorphGeometry", "tmg");
    targetMorphEnabled = makeBool("targetMorphEnabled", "tm", false);
    targetMorphEnvelope =
        makeNumber("targetMorphEnvelope", "tme", HFnNumericData::kDouble, 1.0, {.min = 0, .max = 1}, true);
    poseGenerator = makeMessage("poseGenerator", "pg", false);
    deformerData = makeDeformerData();

    for (const HObject& attribute :
         {modelRoot, trainingDataRoot, exportStartFrame, exportEndFrame, models, exportList, train, controlValues,
          targetGeometry, targetMorphGeometry, targetMorphEnabled, targetMorphEnvelope, poseGenerator, deformerData})
        addAttribute(attribute);

    // an edit of anything that evaluation reads deforms again; what serves training does not
    for (const HObject& attribute : {modelActive, modelName, models, modelRoot, controlValues, targetMorphGeometry,
                                     targetMorphEnabled, targetMorphEnvelope})
        attributeAffects(attribute, outputGeom);
    attributeAffects(filterInputGeometry(), outputGeom);
    attributeAffects(filterInputGeometry(), exportList, true);
    attributeAffects(filterInputGeometry(), train, true);
    return HStatus::kSuccess;
}

} // namespace neuralWarp
