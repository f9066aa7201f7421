// SPDX-License-Identifier: Apache-2.0
// What a scene knows of the character file that it was made of.
#pragma once

#include "openquarn/HPxNode.h"

namespace rig {

/// Holds facts for other tools, and computes nothing. docs/rigNodes.md lists the attributes.
class characterNode final : public HPxNode {
public:
    static const HTypeId id; ///< 0x6e770022
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    characterNode();
    ~characterNode() override;

    /// A vertexMapFile with "{mesh}" in it stands for all files whose names have something in this place. [main]
    HStringArray getFilesToArchive(bool shortName = false, bool unresolvedName = false,
                                   bool markCouldBeImageSequence = false) const override;
    /// The two files can be found, and moved, by the table of external files; but not a vertexMapFile with "{mesh}".
    /// [main]
    void getExternalContent(HExternalContentInfoTable& table) const override;
    void setExternalContent(const HExternalContentLocationTable& table) override;

    static HObject metersPerUnit;
    static HObject framesPerSecond;
    static HObject sourceFile;
    static HObject vertexMapFile;
    static HObject vertexMapDigests;
    static HObject fileOrder;
    static HObject clips;
};

} // namespace rig
