// SPDX-License-Identifier: Apache-2.0
// A scene of meshes that move as a row says.
#pragma once

#include "quarn/play/playing.h"

#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn/HFnPlugin.h"
#include "openquarn/HProfiler.h"
#include "openquarn/HProfilingScope.h"
#include "openquarn/HPxNode.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/Plugins.h"
#include "quarn/console/Console.h"
#include "quarn/scene/SceneSession.h"
#include "quarn/scene/meshes.h"
#include "quarn/scene/plugs.h"
#include "support/TemporaryFolder.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <functional>
#include <map>
#include <string>
#include <vector>

namespace movers {

using namespace quarn;

// the x of its vertices, by the frame: a strip of triangles over them
using Motion = std::function<std::vector<double>(int)>;
inline std::map<std::string, Motion> motions;

inline HObject strip(const std::vector<double>& xs) {
    std::vector<double> xyz;
    MeshPolygons polygons{xs.size(), {}, {}};
    for (std::uint32_t vertex = 0; vertex < xs.size(); ++vertex) {
        xyz.insert(xyz.end(), {xs[vertex], static_cast<double>(vertex % 2), 0.0});
        if (vertex + 2 < xs.size()) {
            polygons.sizes.push_back(3);
            polygons.corners.insert(polygons.corners.end(), {vertex, vertex + 1, vertex + 2});
        }
    }
    return meshData(xyz, polygons);
}

class Mover : public HPxNode {
public:
    static HPxNode* creator() { return new Mover; }
    static HStatus initialize() {
        time = HFnNumericAttribute().create("time", "t", HFnNumericData::kDouble);
        out = HFnTypedAttribute().create("outMesh", "o", HFnData::kMesh);
        HFnAttribute(out).setWritable(false);
        addAttribute(time);
        addAttribute(out);
        return attributeAffects(time, out);
    }
    HStatus compute(const HPlug& plug, HDataBlock& block) override {
        if (plug != out)
            return HStatus::kUnknownParameter;
        const HProfilingScope phase(HProfiler::getCategoryIndex("Evaluation"), 0, "moving");
        const HProfilingScope other(HProfiler::getCategoryIndex("Gossip"), 0, "talking");
        const int frame = static_cast<int>(block.inputValue(time).asDouble());
        return block.outputValue(out).set(strip(motions.at(name().asStdString())(frame)));
    }

private:
    static inline HObject time, out;
};

class Scene : public ::testing::Test {
protected:
    Scene() {
        OpenQuarn::addPlugin(
            "mover",
            [](HObject object) {
                return HFnPlugin(object).registerNode("mover", 0x7e570041, Mover::creator, Mover::initialize);
            },
            [](HObject object) { return HFnPlugin(object).deregisterNode(0x7e570041); });
    }
    static HPlug mesh(const std::string& name, Motion motion) {
        motions[name] = std::move(motion);
        EXPECT_TRUE(OpenQuarn::runScript(
            "createNode mover -name " + name + "; connectAttr time1.outTime " + name + ".time", "play"));
        return findPlug(name + ".outMesh");
    }
    PlayResult play(const PlayPlan& plan) { return playFrames(session_, plan, quiet_); }

    const int isSet_ = ::setenv("NEURALWARP_PLUGIN", NW_PLUGIN, 1);
    SceneSession session_;
    Console quiet_{true, false};
    TemporaryFolder folder_;
};

inline PlayPlan planOf(const HPlug& mesh, FrameRange frames = {1, 5, 1}) {
    PlayPlan plan;
    plan.mesh = mesh;
    plan.frames = frames;
    return plan;
}

} // namespace movers
