// SPDX-License-Identifier: Apache-2.0
// Which file a path stands for, on a disk made for it.
#include "openquarn/HFileObject.h"
#include "openquarn_app/Workspace.h"
#include "support/TemporaryFolder.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

namespace {

namespace fs = std::filesystem;
using OpenQuarn::Workspace;

/// A workspace folder "project" and a current directory "here", each with files of its own; HOME is "home".
class FileObject : public testing::Test {
public:
    FileObject()
        : directoryBefore_(fs::current_path())
        , homeBefore_(std::getenv("HOME") ? std::getenv("HOME") : "") {
        for (const char* file : {"project/both", "here/both", "project/models/a", "here/only", "home/mine"}) {
            fs::create_directories((folder_.path() / file).parent_path());
            std::ofstream(folder_.path() / file) << file;
        }
        fs::current_path(folder_.path() / "here");
        Workspace::setRootDirectory(under("project/"));
        setenv("HOME", under("home").c_str(), 1);
        setenv("NW_TEST_ROOT", folder_.path().c_str(), 1);
        setenv("NW_TEST_DOLLAR", "$HOME", 1);
        unsetenv("NW_TEST_UNSET");
    }
    ~FileObject() override {
        fs::current_path(directoryBefore_);
        setenv("HOME", homeBefore_.c_str(), 1);
        Workspace::resetRootDirectory();
    }

    std::string under(const std::string& path) const { return (folder_.path() / path).string(); }

private:
    TemporaryFolder folder_;
    fs::path directoryBefore_;
    std::string homeBefore_;
};

HFileObject fileObject(const std::string& path, int method) {
    HFileObject file;
    file.setRawFullName(HString(path));
    file.setResolveMethod(method);
    return file;
}

TEST_F(FileObject, ExpandsHomeAndVariables) {
    const struct {
        const char* raw;
        std::string expanded;
    } rows[] = {
        {"", ""},
        {"plain/file", "plain/file"},
        {"~", under("home")},
        {"~/mine", under("home/mine")},
        {"~other/mine", "~other/mine"},
        {"a/~/b", "a/~/b"},
        {"$NW_TEST_ROOT/x", under("x")},
        {"${NW_TEST_ROOT}x", under("").substr(0, under("").size() - 1) + "x"},
        {"a$NW_TEST_UNSET/${NW_TEST_UNSET}b", "a$NW_TEST_UNSET/${NW_TEST_UNSET}b"},
        {"$NW_TEST_DOLLAR/x", "$HOME/x"},
        {"$", "$"},
        {"${", "${"},
        {"${}", "${}"},
        {"cost$$5", "cost$$5"},
    };
    for (const auto& row : rows)
        EXPECT_EQ(fileObject(row.raw, HFileObject::kDefault).expandedFullName(), HString(row.expanded)) << row.raw;
}

TEST_F(FileObject, ResolvesByTheBitsOfTheMethod) {
    const struct {
        std::string raw;
        int method;
        std::string resolved;
        bool exists;
    } rows[] = {
        {"", 54, "", false},
        {under("home/mine"), 54, under("home/mine"), true},
        {under("nowhere"), 54, under("nowhere"), false},
        {under("nowhere"), 22, "", false},
        {"~/mine", 54, under("home/mine"), true},
        {"~/mine", 52, under("project/~/mine"), false},
        {"both", 54, under("project/both"), true},
        {"both", 16, "both", true},
        {"both", 0, "", false},
        {"models", 54, under("project/models"), true}, // folders count
        {"only", 54, "only", true},
        {"only", 4, "", false},
        {"only", 4 | 32, under("project/only"), false},
        {"models/missing", 54, under("project/models/missing"), false},
        {"models/missing", 22, "", false},
        {"$NW_TEST_UNSET/x", 54, under("project/$NW_TEST_UNSET/x"), false},
        {"./models//../both", 54, under("project/./models//../both"), true},
        {"./models//../both", 54 | 1, under("project/both"), true},
        {"only", 8, "", false}, // a scene without a file has no folder
        {std::string(5000, 'x'), 54, under("project/" + std::string(5000, 'x')), false},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.raw + " by " + std::to_string(row.method));
        const HFileObject file = fileObject(row.raw, row.method);
        EXPECT_EQ(file.resolvedFullName(), HString(row.resolved));
        EXPECT_EQ(file.exists(), row.exists);
        EXPECT_EQ(file.rawFullName(), HString(row.raw));
    }
    EXPECT_EQ(HFileObject().resolveMethod(), 54);
}

TEST_F(FileObject, JoinsAWorkspaceRootWithAndWithoutASeparator) {
    for (const std::string& root : {under("project"), under("project/")}) {
        Workspace::setRootDirectory(root);
        EXPECT_EQ(Workspace::rootDirectory(), root);
        EXPECT_EQ(fileObject("both", 54).resolvedFullName(), HString(under("project/both")));
    }
    Workspace::setRootDirectory("");
    EXPECT_EQ(Workspace::rootDirectory(), "");
    EXPECT_EQ(fileObject("missing", 54).resolvedFullName(), "missing");
    Workspace::resetRootDirectory();
    EXPECT_EQ(Workspace::rootDirectory(), fs::current_path().string() + "/");
}

} // namespace
