// SPDX-License-Identifier: Apache-2.0
#include "files/dataFormats.h"
#include "files/valueFiles.h"

#include "core/text.h"
#include "graph/plugImpl.h"
#include "graph/plugName.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <span>
#include <stdexcept>
#include <unordered_set>

namespace OpenQuarn {
namespace {

using Value = storage::JsonValue;

/// A value as a slot holds it.
struct Decoded {
    double number = 0.0;
    std::shared_ptr<Data> data;
    bool isBeyondLimits = false; ///< the file's is; this one is the limit
};

/// Why a value is not taken: what it is not, or why nobody may set it.
struct Misfit {
    std::string why;
    bool isRefused = false;
    explicit operator bool() const { return !why.empty(); }
};

Misfit decodeNumber(const Attribute& attribute, const Value& value, Decoded& decoded) {
    const bool isBool = attribute.number == HFnNumericData::kBoolean && value.IsBool();
    const std::optional<double> number = isBool ? std::optional(value.GetBool() ? 1.0 : 0.0) : numberOf(value);
    if (!number)
        return {std::string("is no ") + attribute.typeName()};
    decoded.number = attribute.stored(attribute.limited(*number));
    decoded.isBeyondLimits = attribute.limited(*number) != *number;
    return {attribute.refusal(*number), true};
}

std::span<const double> numbersIn(const Data& data) {
    if (data.dataType() == HFnData::kMatrix)
        return static_cast<const MatrixData&>(data).value;
    if (data.dataType() == HFnData::kDoubleArray)
        return static_cast<const DoubleArrayData&>(data).values;
    return {};
}

Misfit decodeData(const Attribute& attribute, const Value& value, Decoded& decoded) {
    Misfit misfit;
    decoded.data = readData(attribute, value, misfit.why);
    if (misfit || !decoded.data)
        return misfit;
    for (const double number : numbersIn(*decoded.data))
        if (!std::isfinite(number))
            return {printedNumber(number) + " is not a finite number", true};
    return {};
}

Misfit decode(const Attribute& attribute, const Value& value, Decoded& decoded) {
    if (attribute.isNumber())
        return decodeNumber(attribute, value, decoded);
    if (attribute.holdsData())
        return value.IsNull() ? Misfit() : decodeData(attribute, value, decoded);
    return {value.IsNull() ? "" : "is not null, as the element of a message is"};
}

// Why a file has no values for the field; empty when it may have.
std::string notStored(const Field& field) {
    if (field.computed && !field.attribute->writable)
        return "is an output";
    for (const Field* at = &field; at; at = at->parent)
        if (!at->attribute->storable)
            return "is not kept in scene files";
    return {};
}

class ValueReader {
public:
    ValueReader(const std::shared_ptr<Node>& node, std::vector<KeptMember>& kept, Warnings& warnings)
        : node_(node)
        , kept_(kept)
        , warnings_(warnings) {}

    void read(const std::string& path, const Value& value) {
        HPlug plug;
        try {
            plug = plugNamed(node_, path);
        } catch (const std::invalid_argument& error) {
            keep(path, value, error.what());
            return;
        }
        const Field& field = *plugImpl(plug)->field;
        const bool wholeArray = field.isArray() && !plugImpl(plug)->indices.back();
        if (const std::string why = notStored(field); !why.empty())
            keep(path, value, "'" + nameOf(path) + "' " + why);
        else if (wholeArray && !field.isCompound())
            readRuns(path, plug, value);
        else if (field.isCompound() && !wholeArray)
            readChildren(path, plug, value);
        else if (wholeArray)
            keep(path, value, "'" + nameOf(path) + "' is an array of compounds and needs an index");
        else
            readLeaf(path, plug, value);
    }

private:
    std::string nameOf(const std::string& path) const { return node_->name() + "." + path; }

    void keep(const std::string& path, const Value& value, const std::string& why) {
        kept_.emplace_back(path, jsonOf(value));
        warnings_.add(why + "; its value is kept as it is");
    }

    void keepMisfit(const std::string& path, const Value& value, const Misfit& misfit) {
        if (!misfit.isRefused) {
            keep(path, value, "the value of '" + nameOf(path) + "' " + misfit.why);
            return;
        }
        kept_.emplace_back(path, jsonOf(value));
        warnings_.addError("'" + nameOf(path) + "' cannot be set: " + misfit.why + "; its value is kept as it is");
    }

    void tellLimit(const std::string& path, const Decoded& decoded) {
        if (decoded.isBeyondLimits)
            warnings_.add("the value of '" + nameOf(path) + "' is beyond its limit, " + printedNumber(decoded.number) +
                          ", which is taken");
    }

    // A part of an object that is not understood: kept as an object of its own under the same path.
    void keepMember(const std::string& path, const Value& name, const Value& value, const std::string& why) {
        rapidjson::StringBuffer buffer;
        JsonWriter writer(buffer);
        writer.StartObject();
        writer.key(viewOf(name));
        value.Accept(writer);
        writer.EndObject();
        kept_.emplace_back(path, std::string(buffer.GetString(), buffer.GetSize()));
        warnings_.add("the value of '" + nameOf(path) + "' has a key '" + std::string(viewOf(name)) + "' that " + why +
                      "; it is kept as it is");
    }

    void readLeaf(const std::string& path, const HPlug& plug, const Value& value) {
        const Attribute& attribute = *plugImpl(plug)->field->attribute;
        Decoded decoded;
        if (const Misfit misfit = decode(attribute, value, decoded)) {
            keepMisfit(path, value, misfit);
            return;
        }
        tellLimit(path, decoded);
        assign(*resolvePlugIn(*node_->data(), plug, true), std::move(decoded));
        keepUnknownKeys(path, attribute, value);
    }

    static void assign(Slot& slot, Decoded decoded) {
        slot.number = decoded.number;
        slot.data = std::move(decoded.data);
    }

    void keepUnknownKeys(const std::string& path, const Attribute& attribute, const Value& value) {
        if (!value.IsObject() || attribute.data == HFnData::kString)
            return;
        const std::vector<std::string>& known = knownDataKeys(attribute.data);
        for (const auto& member : value.GetObject())
            if (std::find(known.begin(), known.end(), viewOf(member.name)) == known.end())
                keepMember(path, member.name, member.value, "is not known");
    }

    void readChildren(const std::string& path, const HPlug& plug, const Value& value) {
        if (!value.IsObject()) {
            keepMisfit(path, value, {"is no object"});
            return;
        }
        resolvePlugIn(*node_->data(), plug, true);
        for (const auto& member : value.GetObject())
            read(path + "." + std::string(viewOf(member.name)), member.value);
    }

    void readRuns(const std::string& path, const HPlug& plug, const Value& value) {
        if (!value.IsObject()) {
            keepMisfit(path, value, {"is no object of runs"});
            return;
        }
        const std::shared_ptr<Slot> array = resolvePlugIn(*node_->data(), plug, true);
        for (const auto& member : value.GetObject()) {
            const std::string_view key = viewOf(member.name);
            unsigned first = 0;
            const auto [stop, error] = std::from_chars(key.data(), key.data() + key.size(), first);
            if (error != std::errc() || stop != key.data() + key.size() || !member.value.IsArray())
                keepMember(path, member.name, member.value, "is no run of elements");
            else if (member.value.Size() > 0 && member.value.Size() - 1 > UINT32_MAX - first)
                keepMember(path, member.name, member.value, "goes beyond the highest index, 4294967295");
            else
                readRun(path, *array, first, member.value);
        }
    }

    void readRun(const std::string& path, Slot& array, unsigned index, const Value& run) {
        const Attribute& attribute = *array.field.attribute;
        for (const Value& item : run.GetArray()) {
            Decoded decoded;
            decoded.number = attribute.defaultNumber;
            const bool hasNoValue = item.IsNull() && !attribute.holdsData();
            const Misfit misfit = hasNoValue ? Misfit() : decode(attribute, item, decoded);
            if (!misfit) {
                if (decoded.isBeyondLimits)
                    tellLimit(elementPath(path, index), decoded);
                assign(*array.elementAt(index), std::move(decoded));
                if (item.IsObject())
                    keepUnknownKeys(elementPath(path, index), attribute, item);
            } else {
                keepMisfit(elementPath(path, index), item, misfit);
            }
            ++index; // wraps after the last index, when the run is at its end too
        }
    }

    static std::string elementPath(const std::string& path, unsigned index) {
        return path + "[" + std::to_string(index) + "]";
    }

    const std::shared_ptr<Node>& node_;
    std::vector<KeptMember>& kept_;
    Warnings& warnings_;
};

} // namespace

void readValues(const Value& values, const std::shared_ptr<Node>& node, std::vector<KeptMember>& kept,
                Warnings& warnings) {
    ValueReader reader(node, kept, warnings);
    std::unordered_set<std::string_view> seen;
    for (const auto& member : values.GetObject()) {
        const std::size_t keptBefore = kept.size();
        reader.read(std::string(viewOf(member.name)), member.value);
        // what is kept may stand beside other values of the same name
        if (kept.size() == keptBefore && !member.value.IsObject() && !seen.insert(viewOf(member.name)).second)
            warnings.add("the value of '" + node->name() + "." + std::string(viewOf(member.name)) +
                         "' stands twice; the last one counts");
    }
    for (const std::shared_ptr<Slot>& slot : node->data()->slots)
        if (slot->field.computed)
            slot->markDirty();
}

} // namespace OpenQuarn
