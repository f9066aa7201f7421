// SPDX-License-Identifier: Apache-2.0
// The point cache: a mesh with the points of a file, frame by frame.
#pragma once

#include "openquarn/HPxNode.h"

#include <memory>

namespace storage {
class PointCache;
}

namespace rig {

/// outMesh is inMesh with the points that the file has for the time: its polygons and component tags, the file's
/// positions in object space. docs/pointCache.md lists the attributes.
class pointCacheNode final : public HPxNode {
public:
    static const HTypeId id; ///< 0x6e770021
    static const HString typeName;
    /// Null when there is no memory for a node. [main]
    static HPxNode* create();
    /// Makes the attributes below, and says what affects what. For HFnPlugin::registerNode. [main]
    static HStatus initialize();

    pointCacheNode();
    ~pointCacheNode() override;

    /// Without a text in `cacheFile` outMesh is inMesh. So it is after every failure, which names the node and the
    /// file: the file cannot be read, has no frames, or has another number of vertices than inMesh, where the text has
    /// both; inMesh holds no mesh; the time is no number. The file stays open from one time to the next. [eval]
    HStatus compute(const HPlug& plug, HDataBlock& block) override;

    /// The file can be found, and moved, by the table of external files. [main]
    void getExternalContent(HExternalContentInfoTable& table) const override;
    void setExternalContent(const HExternalContentLocationTable& table) override;

    static HObject cacheFile;
    static HObject time;
    static HObject startFrame;
    static HObject interpolate;
    static HObject inMesh;
    static HObject outMesh;
    static HObject replacedMesh; ///< affects nothing and is never evaluated: what the cache stands in for

private:
    HStatus moveToCache(HDataBlock& block, HObject& mesh);
    void openFile(const HString& rawPath);

    std::unique_ptr<storage::PointCache>
        file_; ///< as of the last compute; null before it, and after a failure to open it
};

} // namespace rig
