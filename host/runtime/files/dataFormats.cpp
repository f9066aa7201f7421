// SPDX-License-Identifier: Apache-2.0
#include "files/dataFormats.h"

#include "core/apiCall.h"
#include "core/text.h"
#include "geometry/MeshData.h"

#include <span>
#include <sstream>
#include <stdexcept>
#include <type_traits>

namespace OpenQuarn {
namespace {

using Value = storage::JsonValue;

template <class Numbers>
void writeNumbers(JsonWriter& writer, const Numbers& numbers) {
    writer.StartArray();
    for (const double number : numbers)
        writer.Double(number);
    writer.EndArray();
}

// False when one of them is no number.
template <class Numbers>
bool readNumbers(const Value& list, Numbers& numbers) {
    std::size_t at = 0;
    for (const Value& item : list.GetArray()) {
        const std::optional<double> number = numberOf(item);
        if (!number)
            return false;
        numbers[at++] = *number;
    }
    return true;
}

// --- texts ---

void writeString(JsonWriter& writer, const Data& data, const std::string&) {
    writer.text(static_cast<const StringData&>(data).value);
}

std::shared_ptr<Data> readString(const Attribute&, const Value& value, std::string& why) {
    const std::optional<std::string> text = textOf(value);
    if (text)
        return std::make_shared<StringData>(*text);
    why = "is no text";
    return nullptr;
}

// --- matrices ---

void writeMatrix(JsonWriter& writer, const Data& data, const std::string&) {
    writeNumbers(writer, static_cast<const MatrixData&>(data).value);
}

std::shared_ptr<Data> readMatrix(const Attribute&, const Value& value, std::string& why) {
    MatrixValue matrix = identityMatrix;
    if (value.IsArray() && value.Size() == matrix.size() && readNumbers(value, matrix))
        return std::make_shared<MatrixData>(matrix);
    why = "is no list of 16 numbers";
    return nullptr;
}

// --- lists of doubles ---

void writeDoubles(JsonWriter& writer, const Data& data, const std::string&) {
    writeNumbers(writer, static_cast<const DoubleArrayData&>(data).values);
}

std::shared_ptr<Data> readDoubles(const Attribute&, const Value& value, std::string& why) {
    if (value.IsArray()) {
        std::vector<double> numbers(value.Size());
        if (readNumbers(value, numbers))
            return std::make_shared<DoubleArrayData>(std::move(numbers));
    }
    why = "is no list of numbers";
    return nullptr;
}

// --- meshes ---

template <class Integers>
void writeIntegers(JsonWriter& writer, const char* key, const Integers& integers) {
    writer.key(key);
    writer.StartArray();
    for (const auto integer : integers)
        writer.Int64(integer);
    writer.EndArray();
}

void writeMesh(JsonWriter& writer, const Data& data, const std::string&) {
    const auto& mesh = static_cast<const MeshData&>(data);
    writer.StartObject();
    writer.key("points");
    const double* xyz = mesh.points->xyz();
    writeNumbers(writer, std::span(xyz, 3 * std::size_t{mesh.vertexCount()}));
    std::vector<unsigned> counts(mesh.topology->polygonCount());
    for (std::size_t i = 0; i < counts.size(); ++i)
        counts[i] = mesh.topology->offsets[i + 1] - mesh.topology->offsets[i];
    writeIntegers(writer, "counts", counts);
    writeIntegers(writer, "corners", mesh.topology->corners);
    if (mesh.uvs) {
        writer.key("uvs");
        writer.StartArray();
        for (const float number : mesh.uvs->uvs)
            writer.floatNumber(number);
        writer.EndArray();
        writeIntegers(writer, "uvCorners", mesh.uvs->corners);
    }
    if (mesh.tags && !mesh.tags->empty()) {
        writer.key("tags");
        writer.StartObject();
        for (const auto& [name, vertices] : *mesh.tags)
            writeIntegers(writer, name.c_str(), *vertices);
        writer.EndObject();
    }
    writer.EndObject();
}

// The list under a key; throws std::invalid_argument when there is none.
const Value& listIn(const Value& object, const char* key) {
    const auto member = object.FindMember(key);
    if (member == object.MemberEnd() || !member->value.IsArray())
        throw std::invalid_argument(std::string("it has no list '") + key + "'");
    return member->value;
}

// `integers` an array of int or unsigned; throws std::invalid_argument when an item is none.
template <class Integers>
void readIntegers(const Value& list, Integers& integers) {
    integers = Integers(list.Size());
    std::size_t at = 0;
    for (const Value& item : list.GetArray()) {
        if (!item.IsInt())
            throw std::invalid_argument("one of its lists holds something that is no whole number");
        integers[at++] = static_cast<std::decay_t<decltype(integers[0])>>(item.GetInt());
    }
}

HPointArray readPoints(const Value& list) {
    std::vector<double> xyz(list.Size());
    if (xyz.size() % 3 != 0 || !readNumbers(list, xyz))
        throw std::invalid_argument("its points are not three numbers each");
    HPointArray points(static_cast<unsigned>(xyz.size() / 3));
    for (std::size_t i = 0; i < points.length(); ++i)
        points[i] = HPoint(xyz[3 * i], xyz[3 * i + 1], xyz[3 * i + 2]);
    return points;
}

std::shared_ptr<MeshData> readUvs(const Value& object, const MeshData& mesh) {
    const Value& list = listIn(object, "uvs");
    std::vector<double> numbers(list.Size());
    if (numbers.size() % 2 != 0 || !readNumbers(list, numbers))
        throw std::invalid_argument("its uvs are not two numbers each");
    HFloatArray us(static_cast<unsigned>(numbers.size() / 2)), vs(us.length());
    for (unsigned uv = 0; uv < us.length(); ++uv) {
        us[uv] = static_cast<float>(numbers[2 * std::size_t{uv}]);
        vs[uv] = static_cast<float>(numbers[2 * std::size_t{uv} + 1]);
    }
    HIntArray corners;
    readIntegers(listIn(object, "uvCorners"), corners);
    return withUvs(mesh, us, vs, corners);
}

std::shared_ptr<const ComponentTags> readTags(const Value& object) {
    auto tags = std::make_shared<ComponentTags>();
    for (const auto& member : object.GetObject()) {
        const std::string name(viewOf(member.name));
        auto vertices = std::make_shared<HUintArray>();
        if (!member.value.IsArray())
            throw std::invalid_argument("its component tag '" + name + "' is no list");
        readIntegers(member.value, *vertices);
        if (!tags->emplace(name, std::move(vertices)).second)
            throw std::invalid_argument("its component tag '" + name + "' stands twice");
    }
    return tags;
}

std::shared_ptr<Data> readMesh(const Attribute&, const Value& value, std::string& why) {
    try {
        if (!value.IsObject())
            throw std::invalid_argument("it is no object");
        HIntArray counts;
        HIntArray corners;
        readIntegers(listIn(value, "counts"), counts);
        readIntegers(listIn(value, "corners"), corners);
        std::shared_ptr<MeshData> mesh = makeMesh(readPoints(listIn(value, "points")), counts, corners);
        if (value.HasMember("uvs") || value.HasMember("uvCorners"))
            mesh = readUvs(value, *mesh);
        const auto tags = value.FindMember("tags");
        if (tags == value.MemberEnd())
            return mesh;
        if (!tags->value.IsObject())
            throw std::invalid_argument("its component tags are no object");
        return withTags(*mesh, readTags(tags->value));
    } catch (const std::invalid_argument& error) {
        why = std::string("is no mesh: ") + error.what();
        return nullptr;
    }
}

// --- data of plug-ins: as the plug-in writes it ---

/// Runs a function of the plug-in's object; what it throws is a failing status.
template <class Call>
HStatus guarded(const char* function, Call&& call) {
    try {
        return call();
    } catch (...) {
        return statusOfException(function);
    }
}

std::string reasonOf(const HStatus& status) {
    return status.errorString().asStdString();
}

void writePlugin(JsonWriter& writer, const Data& data, const std::string& text) {
    writer.StartObject();
    writer.key("typeId");
    writer.Uint(static_cast<const PluginData&>(data).type->id.id());
    writer.key("text");
    writer.text(text);
    writer.EndObject();
}

std::shared_ptr<Data> readPlugin(const Attribute& attribute, const Value& value, std::string& why) {
    const auto text = value.IsObject() ? value.FindMember("text") : Value::ConstMemberIterator();
    const auto id = value.IsObject() ? value.FindMember("typeId") : Value::ConstMemberIterator();
    const bool isWhole = value.IsObject() && text != value.MemberEnd() && id != value.MemberEnd();
    const std::optional<std::string> bytes = isWhole ? textOf(text->value) : std::nullopt;
    if (!bytes || !id->value.IsUint()) {
        why = "is no plug-in data with a type id and a text";
        return nullptr;
    }
    if (HTypeId(id->value.GetUint()) != attribute.pluginData) {
        why = "is of data type " + hexText(id->value.GetUint()) + ", not " + hexText(attribute.pluginData);
        return nullptr;
    }
    std::shared_ptr<PluginData> data;
    const HStatus status = guarded("readASCII", [&] {
        data = createPluginData(attribute.pluginData);
        return data->value->readASCII(HString(*bytes));
    });
    if (!status.error())
        return data;
    why = "could not be read by its data type: " + reasonOf(status);
    return nullptr;
}

struct DataFormat {
    HFnData::Type type;
    std::vector<std::string> keys;
    void (*write)(JsonWriter& writer, const Data& data, const std::string& text);
    std::shared_ptr<Data> (*read)(const Attribute& attribute, const Value& value, std::string& why);
};

const DataFormat* formatOf(HFnData::Type type) {
    static const std::vector<DataFormat> formats = {
        {HFnData::kString, {"hex"}, writeString, readString},
        {HFnData::kMatrix, {}, writeMatrix, readMatrix},
        {HFnData::kDoubleArray, {}, writeDoubles, readDoubles},
        {HFnData::kMesh, {"points", "counts", "corners", "uvs", "uvCorners", "tags"}, writeMesh, readMesh},
        {HFnData::kPlugin, {"typeId", "text"}, writePlugin, readPlugin},
    };
    for (const DataFormat& format : formats)
        if (format.type == type)
            return &format;
    return nullptr;
}

} // namespace

bool preparePluginData(const Data& data, std::string& text, std::string& why) {
    if (!formatOf(data.dataType())) {
        why = "is of a kind that scene files do not hold";
        return false;
    }
    if (data.dataType() != HFnData::kPlugin)
        return true;
    std::ostringstream stream;
    const HStatus status =
        guarded("writeASCII", [&] { return static_cast<const PluginData&>(data).value->writeASCII(stream); });
    if (status.error() && status.statusCode() != HStatus::kNotImplemented)
        why = "could not be written by its data type: " + reasonOf(status);
    text = stream.str();
    return !status.error();
}

void writeData(JsonWriter& writer, const Data& data, const std::string& text) {
    formatOf(data.dataType())->write(writer, data, text);
}

std::shared_ptr<Data> readData(const Attribute& attribute, const Value& value, std::string& why) {
    if (const DataFormat* format = formatOf(attribute.data))
        return format->read(attribute, value, why);
    why = "is of a kind that scene files do not hold";
    return nullptr;
}

const std::vector<std::string>& knownDataKeys(HFnData::Type type) {
    static const std::vector<std::string> none;
    const DataFormat* format = formatOf(type);
    return format ? format->keys : none;
}

} // namespace OpenQuarn
