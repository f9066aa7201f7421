// SPDX-License-Identifier: Apache-2.0
// setAttr: words become the value of a plug.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "commands/WordValues.h"
#include "graph/Graph.h"
#include "graph/plugImpl.h"
#include "openquarn/HFnData.h"
#include "types/matrix.h"

#include <cmath>

namespace OpenQuarn {
namespace {

[[noreturn]] void refuse(const HPlug& plug, const std::string& why) {
    throw std::invalid_argument("'" + plug.name().asStdString() + "' " + why);
}

void must(const HStatus& status) {
    if (status.error())
        throw std::invalid_argument(status.errorString().asStdString());
}

template <class Value>
Value valueOf(const HPlug& plug, const std::string& word) {
    Value value{};
    if (const HStatus status = readWord(word, value); status.error())
        refuse(plug, std::string("cannot be set: ") + status.errorString().asChar());
    return value;
}

std::vector<double> numbersOf(const HPlug& plug, const std::vector<std::string>& words) {
    std::vector<double> numbers;
    numbers.reserve(words.size());
    for (const std::string& word : words)
        numbers.push_back(valueOf<double>(plug, word));
    return numbers;
}

double enumValue(const HPlug& plug, const Attribute& attribute, const std::string& word) {
    for (const auto& [label, value] : attribute.fields)
        if (label == word)
            return value;
    int number = 0;
    if (!readWord(word, number).error() && number >= std::numeric_limits<short>::min() &&
        number <= std::numeric_limits<short>::max())
        return number;
    std::string labels;
    for (const auto& [label, value] : attribute.fields)
        labels += (labels.empty() ? "" : ", ") + label;
    refuse(plug, "cannot be set: " + inQuotes(word) + " is neither a number nor one of its labels (" + labels + ")");
}

double numberIn(const HPlug& plug, const Attribute& attribute, const std::string& word) {
    if (attribute.kind() == HFn::kEnumAttribute)
        return enumValue(plug, attribute, word);
    switch (attribute.number) {
    case HFnNumericData::kBoolean:
        return valueOf<bool>(plug, word) ? 1.0 : 0.0;
    case HFnNumericData::kShort:
    case HFnNumericData::kInt:
        return valueOf<int>(plug, word);
    default:
        return valueOf<double>(plug, word);
    }
}

// a word as the number that the attribute holds
double numberOf(const HPlug& plug, const Attribute& attribute, const std::string& word) {
    const double number = numberIn(plug, attribute, word);
    if (const std::string why = attribute.refusal(number); !why.empty())
        refuse(plug, "cannot be set: " + why);
    return number;
}

const std::string& single(const HPlug& plug, const std::vector<std::string>& words) {
    if (words.size() != 1)
        refuse(plug, "takes one value, not " + std::to_string(words.size()));
    return words.front();
}

void setMatrix(HPlug& plug, const std::vector<std::string>& words) {
    MatrixValue value;
    if (words.size() != value.size())
        refuse(plug, "takes the 16 numbers of a matrix, row by row, not " + std::to_string(words.size()));
    const std::vector<double> numbers = numbersOf(plug, words);
    std::copy(numbers.begin(), numbers.end(), value.begin());
    must(plug.setMatrix(toMatrix(value)));
}

void setDoubles(HPlug& plug, const std::vector<std::string>& words) {
    HStatus status;
    const HObject data = HFnDoubleArrayData().create(numbersOf(plug, words), &status);
    must(status);
    must(plug.setHObject(data));
}

void setOne(HPlug& plug, const Attribute& attribute, const std::vector<std::string>& words) {
    if (attribute.isNumber())
        must(plug.setDouble(numberOf(plug, attribute, single(plug, words))));
    else if (attribute.data == HFnData::kString)
        must(plug.setString(HString(single(plug, words))));
    else if (attribute.data == HFnData::kMatrix)
        setMatrix(plug, words);
    else if (attribute.data == HFnData::kDoubleArray)
        setDoubles(plug, words);
    else if (attribute.isCompound())
        refuse(plug, "is a compound: set its children");
    else
        refuse(plug, std::string("is of type ") + attribute.typeName() + " and cannot be set by a command");
}

// a whole array: elements 0 and up, all of them or none
void setElements(const HPlug& array, const Attribute& attribute, const std::vector<std::string>& words) {
    if (!attribute.isNumber() && attribute.data != HFnData::kString)
        refuse(array, std::string("is an array of type ") + attribute.typeName() + ": set its elements");
    if (words.empty())
        refuse(array, "takes the values of its elements");
    std::vector<double> numbers;
    numbers.reserve(words.size());
    for (unsigned i = 0; i < words.size(); ++i) {
        const std::shared_ptr<Slot> present = nearestExisting(normalContext, array.elementByLogicalIndex(i));
        if (const std::string refused = present ? Graph::setRefusal(*present) : ""; !refused.empty())
            throw std::invalid_argument(refused);
        if (attribute.isNumber())
            numbers.push_back(numberOf(array, attribute, words[i]));
    }
    for (unsigned i = 0; i < words.size(); ++i) {
        HPlug element = array.elementByLogicalIndex(i);
        must(attribute.isNumber() ? element.setDouble(numbers[i]) : element.setString(HString(words[i])));
    }
}

void checkType(const HPlug& plug, const Attribute& attribute, const std::string& type) {
    if (type != attribute.typeName())
        refuse(plug, std::string("is of type ") + attribute.typeName() + ", not " + inQuotes(type));
}

class SetAttr : public Builtin {
    HStatus run(const Arguments& args) override {
        HPlug plug = plugNamed(args.text(0));
        const Attribute& attribute = *plugImpl(plug)->field->attribute;
        const std::vector<std::string> words = args.objects();
        if (args.has("type"))
            checkType(plug, attribute, args.flagText("type"));
        const bool locks = args.has("lock") && valueOf<bool>(plug, args.flagText("lock"));
        if (args.has("lock") && !locks)
            must(plug.setLocked(false));
        if (!words.empty() || !args.has("lock"))
            set(plug, attribute, words);
        if (locks)
            must(plug.setLocked(true));
        return {};
    }

    static void set(HPlug& plug, const Attribute& attribute, const std::vector<std::string>& words) {
        if (plug.isArray())
            setElements(plug, attribute, words);
        else
            setOne(plug, attribute, words);
    }
};

} // namespace

void addSetAttr(CommandRegistry& registry) {
    addBuiltin<SetAttr>(
        registry, "setAttr", "Sets the value of a plug; -lock locks it afterwards, or unlocks it before.",
        SyntaxBuilder().flag("typ", "type", HSyntax::kString).flag("l", "lock", HSyntax::kBoolean).arg().objects(0));
}

} // namespace OpenQuarn
