// SPDX-License-Identifier: Apache-2.0
// The examples of docs/sceneFiles.md: each opens with the warnings that the page tells, comes back when it is saved,
// and evaluates to what the page says.
#include "quarn/rig/RigTest.h"

#include "support/pageExamples.h"

#include <fstream>
#include <sstream>

namespace {

/// A block of the page between two lines of ```.
struct Block {
    std::string kind, text;
};

std::vector<Block> blocksOf(const std::string& page) {
    std::ifstream file(page);
    EXPECT_TRUE(file) << page;
    std::vector<Block> blocks;
    bool inside = false;
    for (std::string line; std::getline(file, line);) {
        const bool isFence = line.starts_with("```");
        if (isFence && !inside)
            blocks.push_back({line.substr(3), {}});
        else if (inside && !isFence)
            blocks.back().text += line + '\n';
        inside = isFence ? !inside : inside;
    }
    return blocks;
}

class SceneFilesPage : public RigTest {
protected:
    /// The warnings, without the name of the file before each.
    std::string openingOf(const std::string& text) {
        const OpenQuarn::FileOutcome outcome = OpenQuarn::sceneFromText(text, "page");
        EXPECT_TRUE(outcome.ok) << outcome.error << '\n' << text;
        std::string warnings;
        for (const std::string& warning : outcome.warnings)
            warnings += warning.substr(std::string("page: ").size()) + '\n';
        takeMessages();
        return warnings;
    }
    static std::string saved() {
        std::string text;
        EXPECT_TRUE(OpenQuarn::sceneToText(text));
        return text;
    }
};

TEST_F(SceneFilesPage, ExamplesOpenComeBackAndGiveWhatItSays) {
    std::string warnings;
    int scenes = 0, promises = 0;
    for (const auto& [kind, text] : blocksOf(NW_SCENE_FILES_PAGE)) {
        if (kind == "json") {
            EXPECT_EQ(warnings, "") << "the page does not tell them";
            warnings = openingOf(text);
            const std::string once = saved();
            EXPECT_EQ(openingOf(once), warnings) << text;
            EXPECT_EQ(saved(), once) << text;
            ++scenes;
        } else if (kind == "text") {
            EXPECT_EQ(warnings, text);
            warnings.clear();
        } else if (kind == "quarn") {
            std::istringstream lines("```quarn\n" + text);
            promises += comparePageExamples(lines, [](const std::string& line) {
                return line == "file -new" ? OpenQuarn::CommandValue() : run(line);
            });
        }
    }
    EXPECT_EQ(warnings, "");
    EXPECT_GE(scenes, 7);
    EXPECT_GE(promises, 25);
}

} // namespace
