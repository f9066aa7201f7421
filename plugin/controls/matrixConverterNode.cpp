// SPDX-License-Identifier: Apache-2.0
#include "controls/matrixConverterNode.h"

#include "controls/arrayOutput.h"
#include "controls/guardedCompute.h"
#include "controls/matrixChannels.h"
#include "controls/matrixInput.h"
#include "messages/messageText.h"
#include "openquarn_helpers/AttributeMaker.h"

#include <vector>

namespace neuralWarp {

using openquarn_helpers::AttributeFlags;
using openquarn_helpers::AttributeMaker;

const HTypeId matrixConverterNode::id(0x58000975);
const HString matrixConverterNode::typeName("matrixConverter");

HObject matrixConverterNode::input;
HObject matrixConverterNode::extractRotation;
HObject matrixConverterNode::extractScale;
HObject matrixConverterNode::extractTranslation;
HObject matrixConverterNode::rotationX;
HObject matrixConverterNode::rotationY;
HObject matrixConverterNode::rotationZ;
HObject matrixConverterNode::scaleX;
HObject matrixConverterNode::scaleY;
HObject matrixConverterNode::scaleZ;
HObject matrixConverterNode::translationX;
HObject matrixConverterNode::translationY;
HObject matrixConverterNode::translationZ;
HObject matrixConverterNode::rotationConversion;
HObject matrixConverterNode::flatOutput;
HObject matrixConverterNode::outputList;
HObject matrixConverterNode::output;

matrixConverterNode::matrixConverterNode() = default;
matrixConverterNode::~matrixConverterNode() = default;

HPxNode* matrixConverterNode::create() {
    return new (std::nothrow) matrixConverterNode;
}

namespace {

HObject makeSwitch(AttributeMaker& attributes, const char* longName, const char* shortName) {
    return attributes.boolean(longName, shortName, true, {.keyable = false});
}

HObject makeConversion(AttributeMaker& attributes) { // in the order of ChannelChoice::Conversion
    return attributes.choice("rotationConversion", "rc",
                             {messageText(Text::kEuler), messageText(Text::kQuaternion), messageText(Text::kDoubleAxis),
                              messageText(Text::kTripleAxis)},
                             ChannelChoice::kEuler);
}

} // namespace

HStatus matrixConverterNode::initialize() {
    constexpr AttributeFlags result{
        .array = true, .builder = true, .writable = false, .onDisconnect = HFnAttribute::kDelete};

    AttributeMaker attributes;
    input = attributes.data("input", "in", HFnData::kMatrix, {.array = true, .onDisconnect = HFnAttribute::kDelete});
    extractRotation = makeSwitch(attributes, "extractRotation", "er");
    extractScale = makeSwitch(attributes, "extractScale", "es");
    extractTranslation = makeSwitch(attributes, "extractTranslation", "et");
    rotationX = makeSwitch(attributes, "rotationX", "rx");
    rotationY = makeSwitch(attributes, "rotationY", "ry");
    rotationZ = makeSwitch(attributes, "rotationZ", "rz");
    scaleX = makeSwitch(attributes, "scaleX", "sx");
    scaleY = makeSwitch(attributes, "scaleY", "sy");
    scaleZ = makeSwitch(attributes, "scaleZ", "sz");
    translationX = makeSwitch(attributes, "translationX", "tx");
    translationY = makeSwitch(attributes, "translationY", "ty");
    translationZ = makeSwitch(attributes, "translationZ", "tz");
    rotationConversion = makeConversion(attributes);
    flatOutput = attributes.number("flatOutput", "fout", HFnNumericData::kDouble, 0.0, result);
    output = attributes.number("output", "out", HFnNumericData::kDouble, 0.0, result);
    outputList = attributes.compound("outputList", "outl", {output}, result);

    const auto inputs = {
        input,  extractRotation, extractScale, extractTranslation, rotationX,    rotationY,    rotationZ,
        scaleX, scaleY,          scaleZ,       translationX,       translationY, translationZ, rotationConversion};
    attributes.add(inputs);
    attributes.add({flatOutput, outputList});
    attributes.affects(inputs, {flatOutput, outputList});
    return attributes.status();
}

namespace {

using Node = matrixConverterNode;

/// The numbers made of one matrix.
struct MatrixRecord {
    unsigned logicalIndex; ///< of the matrix in `input`
    std::vector<double> values;
};
using MatrixRecords = std::vector<MatrixRecord>;

void readSwitch(HDataBlock& block, const HObject& attribute, bool& value, HStatus& status) {
    if (!status.error())
        value = block.inputValue(attribute, &status).asBool();
}

HStatus readChoice(HDataBlock& block, ChannelChoice& choice) {
    HStatus status;
    choice.conversion = block.inputValue(Node::rotationConversion, &status).asShort();
    readSwitch(block, Node::extractRotation, choice.rotation, status);
    readSwitch(block, Node::extractScale, choice.scale, status);
    readSwitch(block, Node::extractTranslation, choice.translation, status);
    const HObject rotation[] = {Node::rotationX, Node::rotationY, Node::rotationZ};
    const HObject scale[] = {Node::scaleX, Node::scaleY, Node::scaleZ};
    const HObject translation[] = {Node::translationX, Node::translationY, Node::translationZ};
    for (unsigned axis = 0; axis < 3; ++axis)
        readSwitch(block, rotation[axis], choice.rotationAxes[axis], status);
    for (unsigned axis = 0; axis < 3; ++axis)
        readSwitch(block, scale[axis], choice.scaleAxes[axis], status);
    for (unsigned axis = 0; axis < 3; ++axis)
        readSwitch(block, translation[axis], choice.translationAxes[axis], status);
    return status;
}

HStatus makeRecords(HDataBlock& block, HArrayDataHandle& matrices, MatrixRecords& records) {
    ChannelChoice choice;
    HStatus status = readChoice(block, choice);
    if (status.error())
        return status;
    records.reserve(matrices.elementCount());
    return forEachMatrix(matrices, [&](unsigned logicalIndex, const HMatrix& matrix) {
        return appendChannels(matrix, choice, records.emplace_back(MatrixRecord{logicalIndex, {}}).values);
    });
}

HStatus writeFlat(HDataBlock& block, const MatrixRecords& records) {
    HStatus status;
    HArrayDataHandle flat = block.outputArrayValue(Node::flatOutput, &status);
    if (status.error())
        return status;
    std::vector<double> values;
    for (const MatrixRecord& record : records)
        values.insert(values.end(), record.values.begin(), record.values.end());
    return writeElements(flat, values, Surplus::remove);
}

HStatus writeList(HDataBlock& block, const MatrixRecords& records) {
    HStatus status;
    HArrayDataHandle list = block.outputArrayValue(Node::outputList, &status);
    if (status.error())
        return status;
    HArrayDataBuilder builder = list.builder(&status);
    if (status.error())
        return status;
    for (const MatrixRecord& record : records) {
        status = writeListElement(list, builder, record.logicalIndex, Node::output, record.values, Surplus::remove);
        if (status.error())
            return status;
    }
    return list.set(builder);
}

} // namespace

HStatus matrixConverterNode::compute(const HPlug& plug, HDataBlock& block) {
    return guardedCompute(*this, "matrixConverterNode::compute", [&]() -> HStatus {
        HStatus status;
        HArrayDataHandle matrices = block.inputArrayValue(input, &status);
        if (status.error())
            return status;
        if (matrices.elementCount() == 0)
            return writeFlat(block, {});
        MatrixRecords records;
        if (status = makeRecords(block, matrices, records); status.error())
            return status;
        if (plug == outputList || plug == output)
            return writeList(block, records);
        return plug == flatOutput ? writeFlat(block, records) : status;
    });
}

} // namespace neuralWarp
