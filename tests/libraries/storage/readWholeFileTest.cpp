// SPDX-License-Identifier: Apache-2.0
#include "libraries/storage/StorageTest.h"

#include "storage/FileError.h"
#include "storage/Folder.h"
#include "storage/FolderLock.h"
#include "storage/readWholeFile.h"

#include <fcntl.h>
#include <sys/stat.h>

namespace {

namespace fs = std::filesystem;
using storage::readWholeFile;
using ::testing::ElementsAre;
using ReadWholeFileTest = StorageTest;
using FolderTest = StorageTest;

TEST_F(ReadWholeFileTest, TakesRegularFilesUpToASize) {
    put("empty", "");
    put("ten", "0123456789");
    EXPECT_EQ(readWholeFile(path("empty"), 0), "");
    EXPECT_EQ(readWholeFile(path("ten"), 10), "0123456789");
    EXPECT_EQ(readWholeFile("/proc/self/comm", 100).back(), '\n') << "has a size of 0";
    EXPECT_EQ(readWholeFile(path("ten"), UINT64_MAX - 1), "0123456789");

    ASSERT_EQ(::mkfifo(path("fifo").c_str(), 0600), 0);
    put("large", "");
    ASSERT_EQ(::truncate(path("large").c_str(), off_t{20} << 30), 0);
    const std::pair<fs::path, std::string> rows[] = {
        {path("none"), " does not exist"},
        {"", " does not exist"},
        {path("ten/below"), " cannot be read: Not a directory"},
        {folder.path(), " is no regular file"},
        {path("fifo"), " is no regular file"},
        {"/dev/zero", " is no regular file"},
        {path("ten"), " has 10 bytes, and at most 9 are read"},
        {path("large"), " has 21474836480 bytes, and at most 9 are read"},
        {"/proc/self/maps", " has more than 9 bytes, and at most 9 are read"},
    };
    for (const auto& [file, error] : rows)
        EXPECT_EQ(failureOf([&, name = file] { readWholeFile(name, 9); }), file.string() + error);
}

TEST_F(FolderTest, TwoExchangeTheirNames) {
    fs::create_directories(path("old"));
    fs::create_directories(path("next"));
    put("old/one", "1");
    put("next/two", "2");
    storage::exchangeFolders(path("next"), path("old"));
    EXPECT_EQ(content("old/two") + content("next/one"), "21");
    EXPECT_THAT(failureOf([&] { storage::exchangeFolders(path("none"), path("old")); }),
                ::testing::HasSubstr("old could not be replaced by "));
    EXPECT_THAT(names(), ElementsAre("next", "old"));
}

TEST_F(FolderTest, IsLockedByOne) {
    {
        storage::FolderLock lock(path("locked"), "a friend");
        EXPECT_TRUE(storage::FolderLock::isTaken(path("locked")));
        EXPECT_EQ(failureOf([&] { storage::FolderLock(path("locked"), "a friend"); }),
                  "a friend is writing " + path("locked").string() + "; wait until it is done");
        fs::rename(path("locked"), path("moved"));
        lock.follow(path("moved"));
        put("moved/file", "");
    }
    EXPECT_FALSE(storage::FolderLock::isTaken(path("moved")));
    EXPECT_EQ(std::distance(fs::directory_iterator(path("moved")), {}), 1) << "the file alone";
    { const storage::FolderLock lock(path("empty"), ""); }
    EXPECT_THAT(names(), ElementsAre("moved"));
}

} // namespace
