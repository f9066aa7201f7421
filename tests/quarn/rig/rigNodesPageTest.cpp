// SPDX-License-Identifier: Apache-2.0
#include "quarn/rig/RigTest.h"

#include "openquarn_app/NodeTypes.h"
#include "support/pageExamples.h"

#include <fstream>
#include <map>
#include <sstream>

namespace {

class RigNodesPage : public RigTest {
protected:
    RigNodesPage() {
        std::ifstream file(NW_RIG_NODES_PAGE);
        EXPECT_TRUE(file) << NW_RIG_NODES_PAGE;
        page << file.rdbuf();
    }

    std::stringstream page;
};

TEST_F(RigNodesPage, NamesEveryAttribute) {
    const std::map<std::string, std::string> arrayBefore = {{"skin", "skin."},
                                                            {"slider", "slider."},
                                                            {"combination", "combination."},
                                                            {"shapes", "shapes."},
                                                            {"shape", "shapes.shape."}};
    for (const std::string type : {"joint", "skinCluster", "sliders", "blendShape", "polyGrid", "animCurve",
                                   "animCurveQuaternion", "character"}) {
        const std::string text = page.str();
        const std::size_t from = text.find("\n## " + type + '\n');
        ASSERT_NE(from, std::string::npos) << type;
        const std::string section = text.substr(from, text.find("\n## ", from + 1) - from);
        for (const OpenQuarn::AttributeInfo& attribute : OpenQuarn::attributesOf(type)) {
            if (attribute.inherited)
                continue;
            const auto before = arrayBefore.find(attribute.parent);
            const std::string name = (before == arrayBefore.end() ? "" : before->second) + attribute.name;
            EXPECT_NE(section.find('`' + name + '`'), std::string::npos) << type << ' ' << name;
            EXPECT_NE(section.find('`' + attribute.shortName + '`'), std::string::npos) << type << ' ' << name;
        }
    }
}

TEST_F(RigNodesPage, ExamplesGiveWhatItSays) {
    EXPECT_GE(comparePageExamples(page, [&](const std::string& line) { return run(line); }), 12);
}

} // namespace
