// SPDX-License-Identifier: Apache-2.0
#include "quarn/rig/RigTest.h"

#include "openquarn_app/NodeTypes.h"
#include "support/pageExamples.h"

#include <fstream>
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
    for (const std::string type : {"joint", "skinCluster", "animCurve", "animCurveQuaternion", "character"}) {
        const std::string text = page.str();
        const std::size_t from = text.find("\n## " + type + '\n');
        ASSERT_NE(from, std::string::npos) << type;
        const std::string section = text.substr(from, text.find("\n## ", from + 1) - from);
        for (const OpenQuarn::AttributeInfo& attribute : OpenQuarn::attributesOf(type)) {
            if (attribute.inherited)
                continue;
            const std::string name = (attribute.parent == "skin" ? "skin." : "") + attribute.name;
            EXPECT_NE(section.find('`' + name + '`'), std::string::npos) << type << ' ' << name;
            EXPECT_NE(section.find('`' + attribute.shortName + '`'), std::string::npos) << type << ' ' << name;
        }
    }
}

TEST_F(RigNodesPage, ExamplesGiveWhatItSays) {
    EXPECT_GE(comparePageExamples(page, [&](const std::string& line) { return run(line); }), 7);
}

} // namespace
