// SPDX-License-Identifier: Apache-2.0
// The pages on node and command: their examples do what they say, and the table of attributes is that of the node.
#include "openquarn/HFnAttribute.h"
#include "openquarn/HFnDependencyNode.h"
#include "openquarn_app/Commands.h"
#include "openquarn_app/SceneFile.h"
#include "openquarn_app/Workspace.h"
#include "plugin/deformer/support/WarpTest.h"
#include "support/pageExamples.h"

#include <fstream>
#include <sstream>

namespace {

namespace fs = std::filesystem;

const fs::path sources = NW_SOURCES;

std::vector<std::string> linesOf(const fs::path& path) {
    std::ifstream file(path);
    std::vector<std::string> lines;
    for (std::string line; std::getline(file, line);)
        lines.push_back(line);
    EXPECT_FALSE(lines.empty()) << path;
    return lines;
}

/// "[long name, short name, type, ...]" of a row of a table; empty for other lines.
std::vector<std::string> cellsOf(const std::string& line) {
    std::vector<std::string> cells;
    std::istringstream row(line.starts_with("| `") ? line.substr(1) : "");
    for (std::string cell; std::getline(row, cell, '|');) {
        const auto first = cell.find_first_not_of(" `");
        cells.push_back(first == std::string::npos ? "" : cell.substr(first, cell.find_last_not_of(" `") + 1 - first));
    }
    return cells;
}

/// The number that the text begins with; on and off are 1 and 0.
double numberIn(const std::string& text) {
    return text == "on" ? 1.0 : std::strtod(text.c_str(), nullptr);
}

double valueOf(const std::string& plug) {
    const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand("getAttr " + plug);
    EXPECT_TRUE(outcome) << outcome.error;
    const std::string printed = OpenQuarn::printedValue(outcome.result);
    return printed == "true" ? 1.0 : numberIn(printed);
}

/// Runs examples in a copy of the repository's examples, from the folder of whatever scene is open, as quarn does.
class Pages : public WarpTest {
protected:
    Pages() {
        fs::copy(sources / "examples", folder.path() / "examples", fs::copy_options::recursive);
        OpenQuarn::Workspace::setCallersFolder(folder.path());
        OpenQuarn::setSceneFolderSink(
            [this](const fs::path& scene) { fs::current_path(scene.empty() ? folder.path() : scene); });
        fs::current_path(folder.path());
    }

public:
    ~Pages() override {
        OpenQuarn::setSceneFolderSink({});
        OpenQuarn::Workspace::setCallersFolder({});
        fs::current_path(before_);
    }

protected:
    /// One line of an example. Behind it may stand "# gives RESULT", "# gives N numbers", "# shows MESSAGE", or, for a
    /// command that fails, "# fails MESSAGE"; all else succeeds, and shows nothing. The result, as far as it is told.
    OpenQuarn::CommandValue runLine(const std::string& line) {
        const auto hash = line.find(" # ");
        const std::string note = hash == std::string::npos ? "" : line.substr(hash + 3);
        const bool fails = note.starts_with("fails ");
        const OpenQuarn::CommandOutcome outcome = OpenQuarn::runCommand(line);
        EXPECT_EQ(outcome.ok, !fails) << line << '\n' << outcome.error;
        std::vector<std::string> messages = takeMessages();
        messages.resize(std::min<std::size_t>(messages.size(), 1));
        const bool shows = fails || note.starts_with("shows ");
        EXPECT_EQ(messages, shows ? std::vector{note.substr(6)} : std::vector<std::string>()) << line;
        if (note.ends_with(" numbers"))
            return std::to_string(std::get<std::vector<double>>(outcome.result).size()) + " numbers";
        return outcome.result;
    }
    int runExamples(const fs::path& page) {
        std::ifstream file(page);
        return comparePageExamples(file, [this](const std::string& line) { return runLine(line); });
    }

private:
    const fs::path before_ = fs::current_path();
};

TEST_F(Pages, TheExamplesDoWhatTheySay) {
    EXPECT_GE(runExamples(sources / "docs" / "neuralWarp.md"), 6);
    EXPECT_GE(runExamples(sources / "docs" / "neuralWarpCommand.md"), 5);
}

TEST_F(Pages, TheTableOfAttributesIsThatOfTheNode) {
    const HObject node = testNodes::create("neuralWarp", "warp1");
    for (const char* element : {"models[0].modelName x", "export[0].trainingDataName x", "train[0].outputModelName x"})
        EXPECT_TRUE(OpenQuarn::runCommand(std::string("setAttr warp1.") + element));
    std::vector<std::string> listed;
    for (const std::string& line : linesOf(sources / "docs" / "neuralWarp.md")) {
        const std::vector<std::string> cells = cellsOf(line);
        if (cells.size() != 6 || cells[1].empty())
            continue;
        SCOPED_TRACE(line);
        listed.push_back(cells[0]);
        const std::string name = cells[0].substr(cells[0].find('.') + 1);
        HStatus status;
        const HObject attribute = HFnDependencyNode(node).attribute(name, &status);
        ASSERT_FALSE(status.error());
        EXPECT_EQ(HFnAttribute(attribute).shortName().asStdString(), cells[1]);
        const std::string array = cells[0].substr(0, cells[0].find('.'));
        const std::string plug = "warp1." + (array == name ? name : array + "[0]." + name);
        if (!cells[3].empty() && cells[3] != "see below" && cells[2] != "array of doubles") {
            EXPECT_EQ(valueOf(plug), numberIn(cells[3]));
        }
        if (const auto to = cells[4].find(" to "); to != std::string::npos) {
            OpenQuarn::runCommand("setAttr " + plug + " -1000000000");
            EXPECT_EQ(valueOf(plug), numberIn(cells[4]));
            OpenQuarn::runCommand("setAttr " + plug + " 1000000000");
            EXPECT_EQ(valueOf(plug), numberIn(cells[4].substr(to + 4)));
        }
    }
    const OpenQuarn::CommandOutcome all = OpenQuarn::runCommand("listAttr warp1");
    for (const std::string& name : std::get<std::vector<std::string>>(all.result)) {
        const std::string own = name.substr(0, name.find('.'));
        static const std::vector<std::string> inherited = {"message",    "input",    "originalGeometry",
                                                           "outputGeom", "envelope", "weightList"};
        if (std::ranges::find(inherited, own) == inherited.end()) {
            EXPECT_THAT(listed, ::testing::Contains(name));
        }
    }
    EXPECT_EQ(listed.size(), 32U);
}

} // namespace
