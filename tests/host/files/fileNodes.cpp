// SPDX-License-Identifier: Apache-2.0
#include "host/files/fileNodes.h"

#include "host/support/attributes.h"

#include "openquarn/HExternalContentInfoTable.h"
#include "openquarn/HExternalContentLocationTable.h"
#include "openquarn/HFileIO.h"
#include "openquarn/HFnData.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HPxData.h"
#include "openquarn_app/SceneFile.h"

#include <limits>
#include <ostream>
#include <stdexcept>

namespace fileNodes {

bool throwing = false;

namespace {

using namespace testAttributes;

constexpr HTypeId nodeId{0x7e570011};
constexpr HTypeId dataId{0x7e570012};

class FileData : public HPxData {
public:
    HStatus readASCII(const HString& written) override {
        text = written.asStdString();
        return text.rfind("bad", 0) == 0 ? HStatus(HStatus::kFailure, "the text is bad") : HStatus();
    }
    HStatus writeASCII(std::ostream& stream) override {
        stream << text;
        return text.rfind("shy", 0) == 0 ? HStatus(HStatus::kFailure, "the data is shy") : HStatus();
    }
    void copy(const HPxData& source) override {
        text = "copy of " + static_cast<const FileData&>(source).text;
        if (text == "copy of unique")
            throw std::runtime_error("there is but one");
    }
    HTypeId typeId() const override { return dataId; }
    HString name() const override { return "fileData"; }
    std::string text;
};

HObject typed(const char* name, HFnData::Type kind, const HObject& value = {}) {
    return HFnTypedAttribute().create(name, name, kind, value);
}
HObject data(const char* name) {
    return HFnTypedAttribute().create(name, name, dataId);
}
HObject messageAttribute(const char* name) {
    return HFnMessageAttribute().create(name, name);
}
HObject matrix(const char* name) {
    return HFnMatrixAttribute().create(name, name);
}
HObject unstored(const HObject& attribute) {
    HFnAttribute(attribute).setStorable(false);
    return attribute;
}

HObject limited(const HObject& attribute, double min, double max) {
    HFnNumericAttribute set(attribute);
    set.setMin(min);
    set.setMax(max);
    return attribute;
}

class FileNode : public HPxNode {
public:
    static HStatus initialize() {
        HFnEnumAttribute choice;
        choice.create("choice", "choice", 1);
        path = typed("path", HFnData::kString);
        HFnAttribute(path).setUsedAsFilename(true);
        const HObject inputs[] = {real("real", 0.5), number("single", HFnNumericData::kFloat, 0.1),
                                  arrayOf(real("weights"))};
        const HObject copied = arrayOf(real("copied"));
        const HObject others[] = {number("yes", HFnNumericData::kBoolean),
                                  number("small", HFnNumericData::kShort),
                                  number("whole", HFnNumericData::kInt, 3),
                                  choice.object(),
                                  real("unusual", std::numeric_limits<double>::infinity()),
                                  limited(real("narrow"), -10.0, 10.0),
                                  typed("word", HFnData::kString, HFnStringData().create("")),
                                  path,
                                  matrix("matrix"),
                                  typed("list", HFnData::kDoubleArray),
                                  data("data"),
                                  typed("mesh", HFnData::kMesh),
                                  arrayOf(number("singles", HFnNumericData::kFloat)),
                                  arrayOf(typed("words", HFnData::kString)),
                                  arrayOf(matrix("matrices")),
                                  arrayOf(messageAttribute("messages")),
                                  arrayOf(data("datas")),
                                  arrayOf(compound("groups", {typed("title", HFnData::kString), arrayOf(real("items")),
                                                              compound("spot", {real("x"), real("y")})})),
                                  unstored(arrayOf(real("state"))),
                                  unstored(typed("note", HFnData::kString)),
                                  copied};
        const HObject out = output(real("out"));
        for (const HObject& attribute : inputs)
            addAttribute(attribute);
        for (const HObject& attribute : others)
            addAttribute(attribute);
        addAttribute(out);
        for (const HObject& attribute : inputs)
            attributeAffects(attribute, out);
        return HStatus::kSuccess;
    }

    void postConstructor() override {
        if (HFileIO::currentlyReadingFileVersion() < 0)
            HFnDependencyNode(thisHObject()).findPlug("word").setString("made");
    }

    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        const HFnDependencyNode set(thisHObject());
        if (plug != set.attribute("out"))
            return HStatus::kUnknownParameter;
        double sum = block.inputValue(set.attribute("real")).asDouble() +
                     static_cast<double>(block.inputValue(set.attribute("single")).asFloat());
        HArrayDataHandle weights = block.inputArrayValue(set.attribute("weights"));
        for (bool more = weights.elementCount() > 0; more; more = !weights.next().error())
            sum += weights.inputValue().asDouble();
        return block.outputValue(plug).set(sum);
    }

    HStringArray getFilesToArchive(bool shortName, bool unresolved, bool sequence) const override {
        if (throwing)
            throw std::runtime_error("no files today");
        return HPxNode::getFilesToArchive(shortName, unresolved, sequence);
    }
    void getExternalContent(HExternalContentInfoTable& table) const override {
        if (throwing)
            throw std::runtime_error("no content today");
        const HString text = HPlug(thisHObject(), path).asString();
        if (text.asStdString().find('*') != std::string::npos)
            table.addUnresolvedEntry("path", text, name(), OpenQuarn::filePatternRole);
        else
            addExternalContentForFileAttr(table, path);
    }
    void setExternalContent(const HExternalContentLocationTable& table) override {
        setExternalContentForFileAttr(path, table);
    }

private:
    static inline HObject path;
};

HStatus initialize(HObject object) {
    HFnPlugin plugin(object);
    const HStatus status = plugin.registerData("fileData", dataId, []() -> HPxData* { return new FileData; });
    return status.error() ? status : plugin.registerNode("fileNode", nodeId, newNode<FileNode>, FileNode::initialize);
}

HStatus uninitialize(HObject object) {
    HFnPlugin plugin(object);
    const HStatus status = plugin.deregisterNode(nodeId);
    return status.error() ? status : plugin.deregisterData(dataId);
}

} // namespace

void registerTypes() {
    throwing = false;
    OpenQuarn::addPlugin("fileNodes", initialize, uninitialize);
}

HObject create(const std::string& name) {
    return HFnDependencyNode().create("fileNode", name);
}

HObject makeData(const std::string& text) {
    HFnPluginData set;
    HObject object = set.create(dataId);
    static_cast<FileData*>(set.data())->text = text;
    return object;
}

std::string textOf(const HObject& object) {
    const HFnPluginData set(object);
    return set.data() ? static_cast<FileData*>(set.data())->text : "none";
}

} // namespace fileNodes
