// SPDX-License-Identifier: Apache-2.0
#include "files/dataFormats.h"
#include "files/valueFiles.h"

#include <bit>
#include <cstdint>

namespace OpenQuarn {
namespace {

bool sameData(const Data* a, const Data* b) {
    if (a == b)
        return true;
    if (!a || !b || a->dataType() != b->dataType())
        return false;
    if (a->dataType() == HFnData::kString)
        return static_cast<const StringData*>(a)->value == static_cast<const StringData*>(b)->value;
    if (a->dataType() != HFnData::kMatrix)
        return false; // larger data is written, not compared
    const MatrixValue& left = static_cast<const MatrixData*>(a)->value;
    const MatrixValue& right = static_cast<const MatrixData*>(b)->value;
    return std::equal(left.begin(), left.end(), right.begin(), [](double x, double y) {
        return std::bit_cast<std::uint64_t>(x) == std::bit_cast<std::uint64_t>(y);
    });
}

bool isDefault(const Slot& slot) {
    const Attribute& attribute = *slot.field.attribute;
    if (attribute.isNumber())
        return std::bit_cast<std::uint64_t>(slot.number) == std::bit_cast<std::uint64_t>(attribute.defaultNumber);
    return !attribute.holdsData() || sameData(slot.data.get(), attribute.defaultData.get());
}

class ValueWriter {
public:
    ValueWriter(JsonWriter& writer, const Node& node, Warnings& warnings)
        : writer_(writer)
        , node_(node)
        , warnings_(warnings) {}

    void run(const std::vector<KeptMember>& kept) {
        for (const std::shared_ptr<Slot>& slot : node_.data()->slots) {
            path_.clear();
            writePart(*slot);
        }
        for (const auto& [path, json] : kept) {
            beginMember(path);
            writer_.raw(json);
        }
        if (count_ > 0)
            writer_.EndObject();
    }

private:
    // `path_` is the path of what is above the slot, and is so again afterwards
    void writePart(const Slot& slot) {
        const Attribute& attribute = *slot.field.attribute;
        if (!attribute.storable || (slot.field.computed && !attribute.writable) || slot.source())
            return;
        const std::size_t length = path_.size();
        path_ += (path_.empty() ? "" : ".") + attribute.name;
        if (slot.isArray())
            writeArray(slot);
        else if (slot.isCompound())
            writeChildren(slot);
        else
            writeLeaf(slot);
        path_.resize(length);
    }

    void writeChildren(const Slot& compound) {
        for (const std::shared_ptr<Slot>& child : compound.children())
            writePart(*child);
    }

    void writeArray(const Slot& array) {
        if (!array.field.isCompound()) {
            writeRuns(array);
            return;
        }
        array.elements().forEach([&](unsigned index, const std::shared_ptr<Slot>& element) {
            if (element->source())
                return; // comes back with its connection
            const std::size_t length = path_.size();
            const std::size_t before = count_;
            path_ += "[" + std::to_string(index) + "]";
            writeChildren(*element);
            if (count_ == before) {
                beginMember(path_);
                writer_.StartObject();
                writer_.EndObject();
            }
            path_.resize(length);
        });
    }

    void writeRuns(const Slot& array) {
        if (array.elements().empty())
            return;
        beginMember(path_);
        writer_.StartObject();
        std::uint64_t next = UINT64_MAX; // the index that goes on with the run
        array.elements().forEach([&](unsigned index, const std::shared_ptr<Slot>& element) {
            if (index != next) {
                if (next != UINT64_MAX)
                    writer_.EndArray();
                writer_.key(std::to_string(index));
                writer_.StartArray();
            }
            next = std::uint64_t{index} + 1;
            std::string text;
            if (element->source() || !canWrite(*element, text))
                writer_.Null();
            else
                writeValue(*element, text);
        });
        writer_.EndArray();
        writer_.EndObject();
    }

    void writeLeaf(const Slot& slot) {
        std::string text;
        if (isDefault(slot) || !canWrite(slot, text))
            return;
        beginMember(path_);
        writeValue(slot, text);
    }

    bool canWrite(const Slot& slot, std::string& text) {
        const Attribute& attribute = *slot.field.attribute;
        if (!attribute.holdsData() || !slot.data)
            return true;
        std::string why;
        const bool can = preparePluginData(*slot.data, text, why);
        if (!can && !why.empty())
            warnings_.add("the value of '" + slot.name() + "' " + why + "; it is not in the file");
        return can;
    }

    void writeValue(const Slot& slot, const std::string& text) {
        const Attribute& attribute = *slot.field.attribute;
        if (attribute.holdsData() && slot.data)
            writeData(writer_, *slot.data, text);
        else if (!attribute.isNumber())
            writer_.Null();
        else if (attribute.number == HFnNumericData::kBoolean)
            writer_.Bool(slot.number != 0.0);
        else if (attribute.number == HFnNumericData::kFloat)
            writeFloat(slot.number);
        else
            writer_.Double(slot.number);
    }

    void writeFloat(double number) {
        // a default that was given with more digits than a float has
        if (static_cast<double>(static_cast<float>(number)) == number)
            writer_.floatNumber(static_cast<float>(number));
        else
            writer_.Double(number);
    }

    void beginMember(std::string_view path) {
        if (count_++ == 0) {
            writer_.key("values");
            writer_.StartObject();
        }
        writer_.key(path);
    }

    JsonWriter& writer_;
    const Node& node_;
    Warnings& warnings_;
    std::string path_;
    std::size_t count_ = 0; // members written
};

} // namespace

void writeValues(JsonWriter& writer, const Node& node, const std::vector<KeptMember>& kept, Warnings& warnings) {
    ValueWriter(writer, node, warnings).run(kept);
}

} // namespace OpenQuarn
