// SPDX-License-Identifier: Apache-2.0
#include "rig/characterNode.h"

#include "openquarn_helpers/AttributeMaker.h"

#include "openquarn/HExternalContentInfoTable.h"

#include <filesystem>
#include <string>
#include <string_view>
#include <system_error>

namespace rig {

using openquarn_helpers::AttributeMaker;

const HTypeId characterNode::id(0x6e770022);
const HString characterNode::typeName("character");

HObject characterNode::metersPerUnit;
HObject characterNode::framesPerSecond;
HObject characterNode::sourceFile;
HObject characterNode::vertexMapFile;
HObject characterNode::vertexMapDigests;
HObject characterNode::fileOrder;
HObject characterNode::clips;

characterNode::characterNode() = default;
characterNode::~characterNode() = default;

HPxNode* characterNode::create() {
    return new (std::nothrow) characterNode;
}

HStatus characterNode::initialize() {
    AttributeMaker make;
    metersPerUnit = make.real("metersPerUnit", "mpu", 1.0);
    framesPerSecond = make.real("framesPerSecond", "fps", 24.0);
    sourceFile = make.data("sourceFile", "sf", HFnData::kString, {.filename = true});
    vertexMapFile = make.data("vertexMapFile", "vmf", HFnData::kString, {.filename = true});
    vertexMapDigests = make.data("vertexMapDigests", "vmd", HFnData::kString);
    fileOrder = make.data("fileOrder", "fo", HFnData::kString);
    clips = make.data("clips", "clp", HFnData::kString);
    make.add({metersPerUnit, framesPerSecond, sourceFile, vertexMapFile, vertexMapDigests, fileOrder, clips});
    return make.status();
}

namespace {

constexpr std::string_view meshPlace = "{mesh}";

bool isPattern(const std::string& text) {
    return text.find(meshPlace) != std::string::npos;
}

/// The files that are called like the pattern with any text in place of the mesh's name.
void addFilesLike(const std::string& pattern, HStringArray& files) {
    const std::filesystem::path path(pattern);
    const std::string name = path.filename().string();
    const std::size_t place = name.find(meshPlace);
    if (place == std::string::npos)
        return;
    const std::string_view begin = std::string_view(name).substr(0, place);
    const std::string_view end = std::string_view(name).substr(place + meshPlace.size());
    std::error_code none;
    for (const auto& entry : std::filesystem::directory_iterator(path.parent_path(), none)) {
        const std::string file = entry.path().filename().string();
        if (file.size() > begin.size() + end.size() && file.starts_with(begin) && file.ends_with(end))
            files.append(entry.path().c_str());
    }
}

} // namespace

HStringArray characterNode::getFilesToArchive(bool shortName, bool unresolvedName, bool markSequence) const {
    const HStringArray texts = HPxNode::getFilesToArchive(shortName, unresolvedName, markSequence);
    HStringArray files;
    for (const HString& text : texts) {
        if (unresolvedName || !isPattern(text.asStdString()))
            files.append(text);
        else
            addFilesLike(text.asStdString(), files);
    }
    return files;
}

void characterNode::getExternalContent(HExternalContentInfoTable& table) const {
    addExternalContentForFileAttr(table, sourceFile);
    const HString map = HPlug(thisHObject(), vertexMapFile).asString();
    if (isPattern(map.asStdString()))
        table.addUnresolvedEntry("vertexMapFile", map, name(), "file pattern");
    else
        addExternalContentForFileAttr(table, vertexMapFile);
    HPxNode::getExternalContent(table);
}

void characterNode::setExternalContent(const HExternalContentLocationTable& table) {
    setExternalContentForFileAttr(sourceFile, table);
    setExternalContentForFileAttr(vertexMapFile, table);
    HPxNode::setExternalContent(table);
}

} // namespace rig
