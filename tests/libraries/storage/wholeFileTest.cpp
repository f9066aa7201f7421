// SPDX-License-Identifier: Apache-2.0
// Every way in which a file is replaced, refused or written through, and what it leaves behind.
#include "libraries/storage/StorageTest.h"

#include "storage/FileError.h"
#include "storage/WholeFile.h"

#include <cstring>

#include <fcntl.h>
#include <sys/mount.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <sys/un.h>

namespace {

namespace fs = std::filesystem;
using storage::WholeFile;
using storage::writeWhole;
using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::StartsWith;

class WholeFileTest : public StorageTest {
protected:
    /// Both the question before and the writing are refused, with a sentence that begins with the path.
    void expectRefused(const fs::path& file, const std::string& why,
                       WholeFile::Writes writes = WholeFile::Writes::inOrder) const {
        const auto isWhy = AllOf(StartsWith(file.string() + " could not be written: "), HasSubstr(why));
        EXPECT_THAT(failureOf([&] { WholeFile::requirePossible(file, writes); }), isWhy);
        EXPECT_THAT(failureOf([&] { WholeFile(file, writes).finish(); }), isWhy);
    }
    static unsigned modeOf(const fs::path& file) {
        struct stat status = {};
        return ::stat(file.c_str(), &status) == 0 ? status.st_mode & 07777U : 0;
    }
};

TEST_F(WholeFileTest, IsThereAsAWholeOrNotAtAll) {
    {
        WholeFile file(path("a"));
        file.stream() << "half";
        EXPECT_FALSE(fs::exists(path("a")));
    }
    EXPECT_THAT(names(), IsEmpty());
    put("a", "old");
    {
        WholeFile file(path("a"), WholeFile::Writes::anywhere);
        file.stream() << std::string(200'000, 'x') << 1.5;
        file.rewind();
        file.write(std::as_bytes(std::span("head", 4)));
        EXPECT_EQ(content("a"), "old");
        file.finish();
    }
    EXPECT_EQ(content("a"), "head" + std::string(199'996, 'x') + "1.5");
    const std::string longest(255, 'n');
    writeWhole(path(longest), "as long as a name can be");
    writeWhole(path("new/folders/b"), "");
    { const WholeFile never(path("never/made/c")); }
    EXPECT_THAT(names(), ElementsAre("a", "new", longest));
}

TEST_F(WholeFileTest, LinksPermissionsAndGroupStay) {
    put("real", "old");
    const gid_t group = ::chown(path("real").c_str(), ~0U, 12345) == 0 ? 12345 : ::getegid();
    ASSERT_EQ(::chmod(path("real").c_str(), 04640), 0);
    fs::create_directory(path("folder"));
    fs::create_symlink("../real", path("folder/link"));
    fs::create_symlink(path("folder/link"), path("link"));
    fs::create_symlink("later", path("dangling"));
    writeWhole(path("link"), "new");
    writeWhole(path("dangling"), "now");
    EXPECT_EQ(content("real"), "new");
    EXPECT_EQ(modeOf(path("real")), 0640U) << "and no right to be somebody else";
    struct stat status = {};
    EXPECT_TRUE(::stat(path("real").c_str(), &status) == 0 && status.st_gid == group);
    EXPECT_EQ(content("later"), "now");
    EXPECT_TRUE(fs::is_symlink(path("link")) && fs::is_symlink(path("folder/link")) &&
                fs::is_symlink(path("dangling")));

    // what stands under the names of temporary files is nothing to write through: they were planted
    put("victim", "untouched");
    const std::string temporary = WholeFile(path("real")).temporary().filename();
    EXPECT_LE(temporary.size(), 60U);
    fs::create_symlink("victim", path(temporary));
    writeWhole(path("real"), "beside it");
    EXPECT_EQ(content("real"), "beside it");
    EXPECT_EQ(content("victim"), "untouched");
}

TEST_F(WholeFileTest, WhatMustNotBeReplacedIsRefusedByName) {
    fs::create_directory(path("folder"));
    put("file", "");
    fs::create_symlink("loop", path("loop"));
    const int socket = ::socket(AF_UNIX, SOCK_STREAM, 0);
    struct sockaddr_un address = {AF_UNIX, {}};
    std::strncpy(address.sun_path, path("socket").c_str(), sizeof address.sun_path - 1);
    ASSERT_EQ(::bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);

    expectRefused(path("folder"), "Is a directory");
    expectRefused(path("folder/"), "Is a directory");
    expectRefused(path("none/.."), "Is a directory");
    expectRefused("", "No such file");
    expectRefused(path("file/below"), "Not a directory");
    expectRefused(path(std::string(256, 'n')), "File name too long");
    expectRefused(path("loop"), "Too many levels of symbolic links");
    expectRefused(path("socket"), "a device or a socket");
    expectRefused("/dev/fd/12345", "Bad file descriptor");
    EXPECT_THAT(names(), ElementsAre("file", "folder", "loop", "socket"));
    ::close(socket);
}

TEST_F(WholeFileTest, AWriteProtectedFileIsNotReplaced) {
    put("mine", "precious");
    fs::create_directories(path("closed"));
    ASSERT_EQ(::chmod(path("mine").c_str(), 0444), 0);
    ASSERT_EQ(::chmod(path("closed").c_str(), 0555), 0);
    const int refusal = withoutPrivileges([&] {
        expectRefused(path("mine"), "Permission denied");
        expectRefused(path("closed/new"), "Permission denied");
        expectRefused(path("closed/new/file"), "Permission denied");
    });
    ::chmod(path("closed").c_str(), 0755);
    if (refusal != 0)
        GTEST_SKIP() << "permissions do not count for this user, and the capabilities could not be given up: "
                     << std::strerror(refusal);
    EXPECT_EQ(content("mine"), "precious");
    // while it was being written, too
    bool isRefused = false;
    ::chmod(path("mine").c_str(), 0644);
    withoutPrivileges([&] {
        WholeFile file(path("mine"));
        ::chmod(path("mine").c_str(), 0444);
        isRefused = failureOf([&] { file.finish(); }).find("Permission denied") != std::string::npos;
    });
    EXPECT_TRUE(isRefused);
    EXPECT_EQ(content("mine"), "precious");
    EXPECT_THAT(names(), ElementsAre("closed", "mine"));
}

TEST_F(WholeFileTest, APipeAndADescriptorAreWrittenThrough) {
    ASSERT_EQ(::mkfifo(path("fifo").c_str(), 0600), 0);
    int pipes[2] = {};
    ASSERT_EQ(::pipe2(pipes, O_CLOEXEC), 0);
    const std::string descriptor = "/dev/fd/" + std::to_string(pipes[1]);
    fs::create_symlink(descriptor, path("link"));
    std::string text(100, '\0');
    for (const std::string& place : {descriptor, "/proc/self/fd/" + std::to_string(pipes[1]), path("link").string()}) {
        WholeFile file(place);
        std::ofstream(file.temporary()) << "by name";
        file.finish();
        EXPECT_EQ(text.substr(0, static_cast<std::size_t>(::read(pipes[0], text.data(), text.size()))), "by name");
    }

    std::string read;
    std::thread reader([&] { read = content("fifo"); });
    writeWhole(path("fifo"), std::string(300'000, 'f'));
    reader.join();
    EXPECT_EQ(read, std::string(300'000, 'f'));
    EXPECT_TRUE(fs::is_fifo(path("fifo")));

    storage::setStandardOutput(pipes[1]);
    writeWhole("/dev/stdout", "aside");
    storage::setStandardOutput(-1);
    EXPECT_EQ(text.substr(0, static_cast<std::size_t>(::read(pipes[0], text.data(), text.size()))), "aside");

    for (const std::string& place : {descriptor, path("fifo").string(), path("link").string()})
        expectRefused(place, "one after the other only", WholeFile::Writes::anywhere);
    // a file behind a descriptor goes on where it is
    const int file = ::open(path("log").c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0600);
    writeWhole("/dev/fd/" + std::to_string(file), "one ");
    writeWhole("/dev/fd/" + std::to_string(file), "two");
    EXPECT_EQ(content("log"), "one two");
    for (const int open : {file, pipes[0], pipes[1]})
        ::close(open);
}

// nodes of our own, so that a fault does not take away the machine's
TEST_F(WholeFileTest, DevicesSurvive) {
    if (::mknod(path("null").c_str(), S_IFCHR | 0666, makedev(1, 3)) != 0 ||
        ::mknod(path("full").c_str(), S_IFCHR | 0666, makedev(1, 7)) != 0)
        GTEST_SKIP() << "this user cannot make a device: " << std::strerror(errno);
    fs::create_symlink("null", path("link"));
    for (const char* name : {"null", "link"}) {
        EXPECT_EQ(failureOf([&] { writeWhole(path(name), "gone"); }), ""); // or a mount that has no devices
        expectRefused(path(name), "one after the other only", WholeFile::Writes::anywhere);
    }
    expectRefused(path("full"), "a device or a socket");
    for (const char* name : {"null", "full"})
        EXPECT_TRUE(fs::is_character_file(path(name))) << name;
    EXPECT_THAT(names(), ElementsAre("full", "link", "null"));
}

TEST_F(WholeFileTest, AFullDiskIsSaidWithTheNameOfTheFile) {
    put("old", "stays");
    {
        const FileSizeLimit few(1000);
        EXPECT_EQ(failureOf([&] { writeWhole(path("old"), std::string(2000, 'x')); }),
                  path("old").string() + " could not be written: File too large");
    }

    const int full = ::open("/dev/full", O_WRONLY | O_CLOEXEC);
    const std::string place = "/dev/fd/" + std::to_string(full);
    EXPECT_EQ(failureOf([&] { writeWhole(place, "x"); }), place + " could not be written: No space left on device");
    ::close(full);

    fs::create_directory(path("disk"));
    if (::mount("tmpfs", path("disk").c_str(), "tmpfs", 0, "size=64k") == 0) {
        for (const std::size_t size : {100'000U, 10'000'000U})
            EXPECT_EQ(failureOf([&] { writeWhole(path("disk/file"), std::string(size, 'x')); }),
                      path("disk/file").string() + " could not be written: No space left on device");
        EXPECT_TRUE(fs::is_empty(path("disk")));
        ::umount2(path("disk").c_str(), MNT_DETACH);
    } else {
        std::printf("not tried on a full disk: mounting a small one was refused: %s\n", std::strerror(errno));
    }
    EXPECT_EQ(content("old"), "stays");
    EXPECT_THAT(names(), ElementsAre("disk", "old"));
}

} // namespace
