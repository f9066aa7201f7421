// SPDX-License-Identifier: Apache-2.0
// getAttr: the value of a plug, evaluated.
#include "builtins/Builtin.h"
#include "builtins/builtins.h"
#include "builtins/names.h"
#include "commands/WordValues.h"
#include "graph/Graph.h"
#include "graph/evaluation.h"
#include "graph/plugImpl.h"
#include "graph/values.h"

#include <array>
#include <charconv>

namespace OpenQuarn {
namespace {

// 0.2 for a float that was set to 0.2: the double in the fewest digits that make the same float
double shortest(double value) {
    std::array<char, 32> digits{};
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), static_cast<float>(value));
    std::from_chars(digits.data(), end.ptr, value);
    return value;
}

bool isWhole(const Attribute& attribute) {
    return attribute.kind() == HFn::kEnumAttribute || attribute.number == HFnNumericData::kShort ||
           attribute.number == HFnNumericData::kInt;
}

double realIn(const Slot& slot) {
    const bool isFloat = slot.field.attribute->number == HFnNumericData::kFloat;
    return isFloat ? shortest(numberIn(slot)) : numberIn(slot);
}

CommandValue dataValue(const Slot& slot) {
    const Data* data = slot.data.get();
    switch (slot.field.attribute->data) {
    case HFnData::kString:
        return textIn(slot);
    case HFnData::kMatrix: {
        const MatrixValue matrix = matrixIn(slot);
        return std::vector<double>(matrix.begin(), matrix.end());
    }
    case HFnData::kDoubleArray: {
        const auto* numbers = dynamic_cast<const DoubleArrayData*>(data);
        return numbers ? numbers->values : std::vector<double>();
    }
    default:
        throw std::invalid_argument("'" + slot.name() + "' is of type " + slot.field.attribute->typeName() +
                                    ", which has no value to show");
    }
}

CommandValue leafValue(const Slot& slot) {
    const Attribute& attribute = *slot.field.attribute;
    if (!attribute.isNumber())
        return dataValue(slot);
    if (attribute.number == HFnNumericData::kBoolean)
        return numberIn(slot) != 0.0;
    if (isWhole(attribute))
        return intIn(slot);
    return realIn(slot);
}

template <class Item, class Read>
std::vector<Item> elementsOf(const Slot& array, Read&& read) {
    std::vector<Item> items;
    items.reserve(array.elements().size());
    array.elements().forEach([&](unsigned, const std::shared_ptr<Slot>& element) { items.push_back(read(*element)); });
    return items;
}

CommandValue arrayValue(const Slot& array) {
    const Attribute& attribute = *array.field.attribute;
    if (attribute.isNumber() && (isWhole(attribute) || attribute.number == HFnNumericData::kBoolean))
        return elementsOf<int>(array, intIn);
    if (attribute.isNumber())
        return elementsOf<double>(array, realIn);
    if (attribute.data == HFnData::kString)
        return elementsOf<std::string>(array, textIn);
    throw std::invalid_argument("'" + array.name() + "' is an array of type " + attribute.typeName() +
                                ": ask for its elements");
}

CommandValue valueOf(const Slot& slot) {
    if (slot.isArray())
        return arrayValue(slot);
    if (slot.isCompound())
        throw std::invalid_argument("'" + slot.name() + "' is a compound: ask for its children");
    return leafValue(slot);
}

CommandValue indicesOf(const Slot& slot) {
    if (!slot.isArray())
        throw std::invalid_argument("'" + slot.name() + "' is not an array");
    std::vector<double> indices; // up to 2^32 - 1
    slot.elements().forEach([&](unsigned index, const std::shared_ptr<Slot>&) { indices.push_back(index); });
    return indices;
}

CommandValue labelOf(const Slot& slot) {
    for (const auto& [label, value] : slot.field.attribute->fields)
        if (slot.isLeaf() && value == intIn(slot))
            return label;
    throw std::invalid_argument("'" + slot.name() + "' has no label for its value");
}

class GetAttr : public Builtin {
    HStatus run(const Arguments& args) override {
        const HPlug plug = plugNamed(args.text(0));
        const std::shared_ptr<Slot> slot = slotToEvaluate(normalContext, plug);
        if (!slot)
            throw std::invalid_argument("'" + plug.name().asStdString() + "' does not exist");
        if (args.has("lock")) {
            give(slot->locked);
            return {};
        }
        HStatus status = pull(slot);
        if (!status.error())
            give(asked(args, *resolvePlug(normalContext, plug)));
        return status;
    }

    static CommandValue asked(const Arguments& args, const Slot& slot) {
        if (args.has("multiIndices"))
            return indicesOf(slot);
        return args.has("asString") ? labelOf(slot) : valueOf(slot);
    }
};

} // namespace

void addGetAttr(CommandRegistry& registry) {
    addBuiltin<GetAttr>(registry, "getAttr", "Gives the value of a plug, evaluated first.",
                        SyntaxBuilder().flag("as", "asString").flag("mi", "multiIndices").flag("l", "lock").arg());
}

} // namespace OpenQuarn
