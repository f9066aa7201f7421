// SPDX-License-Identifier: Apache-2.0
#include "storage/TemporaryFile.h"

#include "storage/FileError.h"
#include "storage/Fnv64.h"
#include "storage/Folder.h"
#include "storage/Target.h"

#include <array>
#include <cerrno>
#include <random>
#include <string>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/utsname.h>
#include <unistd.h>

namespace storage {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view prefix = ".whole-";
constexpr std::string_view ending = ".part";
// of one target at the same time on one machine, and so many names are looked at for what a killed one has left
constexpr int mostWriters = 64;

std::string sumOf(std::span<const std::byte> bytes) {
    Fnv64 sum;
    sum.add(bytes);
    return sum.text();
}

std::string sumOf(std::string_view text) {
    return sumOf(std::as_bytes(std::span(text)));
}

std::string beginningFor(std::string_view target) {
    return std::string(prefix) + sumOf(target) + "-";
}

std::string bootText() {
    const Descriptor file(::open("/proc/sys/kernel/random/boot_id", O_RDONLY | O_CLOEXEC));
    std::array<char, 64> text{};
    const ssize_t size = file.isOpen() ? ::read(file.number(), text.data(), text.size()) : -1;
    return size > 0 ? std::string(text.data(), static_cast<std::size_t>(size)) : std::string();
}

// Empty where it cannot be told. A lock tells whether a writer lives only among those who see each other's locks: the
// processes under one kernel.
std::string markOfThisBoot() {
    struct utsname host = {};
    const std::string boot = bootText();
    if (boot.empty() || ::uname(&host) != 0)
        return {};
    return sumOf(boot + host.nodename);
}

std::string uniqueMark() {
    std::random_device random;
    const std::array numbers{random(), random()};
    return "unlocked" + sumOf(std::as_bytes(std::span(numbers)));
}

fs::path nameFor(const fs::path& target, const std::string& mark, int number) {
    return target.parent_path() /
           (beginningFor(target.filename().native()) + mark + "-" + std::to_string(number) + std::string(ending));
}

// To lock it: NFS wants a file that is open for writing; elsewhere one does that may only be read.
Descriptor openToLock(const fs::path& name) {
    constexpr int flags = O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;
    const int file = ::open(name.c_str(), O_RDWR | flags);
    return Descriptor(file >= 0 || errno != EACCES ? file : ::open(name.c_str(), O_RDONLY | flags));
}

// takes away what a killed writer has left; a living one holds the lock
void sweep(const fs::path& name) {
    const Descriptor file = openToLock(name);
    struct stat status = {};
    if (file.isOpen() && ::fstat(file.number(), &status) == 0 && S_ISREG(status.st_mode) &&
        ::flock(file.number(), LOCK_EX | LOCK_NB) == 0 && isAt(name, file.number()))
        ::unlink(name.c_str());
}

} // namespace

TemporaryFile::TemporaryFile(const fs::path& target, const fs::path& path)
    : target_(target)
    , shown_(path) {
    if (const std::string mark = markOfThisBoot(); !mark.empty()) {
        for (int number = 0; number < mostWriters; ++number)
            sweep(nameFor(target, mark, number));
        for (int number = 0; number < mostWriters; ++number)
            if (make(nameFor(target, mark, number)) && lock())
                return;
    }
    // there are no locks here, or too many writers: a name that nobody takes for one left behind
    if (!make(nameFor(target, uniqueMark(), 0)))
        failToWrite(shown_, EEXIST);
}

// false: there are no locks here, or a sweep came between making and locking, and the file is not ours any more
bool TemporaryFile::lock() {
    const bool isLocked = ::flock(file_.number(), LOCK_EX | LOCK_NB) == 0;
    if (isLocked && isAt(name_, file_.number()))
        return true;
    if (!isLocked && errno != EWOULDBLOCK)
        ::unlink(name_.c_str());
    name_.clear();
    return false;
}

// false: there is something of that name
bool TemporaryFile::make(const fs::path& name) {
    file_ = Descriptor(::open(name.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0666));
    if (file_.isOpen())
        name_ = name;
    else if (errno != EEXIST)
        failToWrite(shown_, errno);
    return file_.isOpen();
}

TemporaryFile::~TemporaryFile() {
    if (!name_.empty())
        ::unlink(name_.c_str());
}

void TemporaryFile::takePermissions() {
    takePermissionsOf(target_, file_.number(), shown_);
}

// the lock is held until the name is gone: nobody takes it for one left behind
void TemporaryFile::publish() {
    if (::fsync(file_.number()) != 0)
        failToWrite(shown_, errno);
    requireReplaceable(target_, shown_);
    if (::rename(name_.c_str(), target_.c_str()) != 0)
        failToWrite(shown_, errno);
    name_.clear();
    flushNames(target_.parent_path());
}

bool TemporaryFile::isOf(std::string_view name, std::string_view target) {
    return name.starts_with(beginningFor(target)) && name.ends_with(ending);
}

} // namespace storage
