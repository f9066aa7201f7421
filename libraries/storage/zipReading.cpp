// SPDX-License-Identifier: Apache-2.0
#include "storage/byteOrder.h"
#include "storage/zipArchive.h"
#include "storage/zipRecords.h"

#include <algorithm>
#include <stdexcept>
#include <string_view>
#include <vector>

namespace storage {
namespace {

[[noreturn]] void refuse(const std::string& why) {
    throw std::runtime_error(why);
}

/// `length` bytes that are to be there.
std::string wanted(const FileBytes& file, std::uint64_t from, std::size_t length, const char* what) {
    if (from > file.size || length > file.size - from)
        refuse(std::string("it is damaged: its ") + what + " lies beyond its end, at byte " + std::to_string(from));
    return file.text(from, length);
}

void requireMark(std::string_view bytes, std::uint32_t mark, const char* what) {
    if (littleAt<std::uint32_t>(bytes, 0) != mark)
        refuse(std::string("it is damaged: its ") + what + " does not begin as one");
}

/// Where the end record is: nothing but its comment lies behind it.
std::uint64_t findEnd(const FileBytes& file) {
    constexpr std::uint64_t mostComment = 0xFFFF;
    const std::uint64_t tail = std::min<std::uint64_t>(file.size, zip::endSize + mostComment);
    const std::string bytes = file.text(file.size - tail, static_cast<std::size_t>(tail));
    if (bytes.size() >= zip::endSize)
        for (std::size_t place = bytes.size() - zip::endSize + 1; place-- > 0;)
            if (littleAt<std::uint32_t>(bytes, place) == zip::endMark &&
                place + zip::endSize + littleAt<std::uint16_t>(bytes, place + 20) == bytes.size())
                return file.size - tail + place;
    refuse("it is no archive of NumPy, or cut short: no directory is at its end");
}

struct Directory {
    std::uint64_t start = 0;
    std::uint64_t size = 0;
};

Directory findDirectory(const FileBytes& file) {
    const std::uint64_t end = findEnd(file);
    const std::string record = file.text(end, zip::endSize);
    Directory directory{littleAt<std::uint32_t>(record, 16), littleAt<std::uint32_t>(record, 12)};
    if (end < zip::locatorSize)
        return directory;
    const std::string locator = file.text(end - zip::locatorSize, zip::locatorSize);
    if (littleAt<std::uint32_t>(locator, 0) != zip::locatorMark)
        return directory;
    const std::string large = wanted(file, littleAt<std::uint64_t>(locator, 8), zip::largeEndSize, "64-bit end record");
    requireMark(large, zip::largeEndMark, "64-bit end record");
    return {littleAt<std::uint64_t>(large, 48), littleAt<std::uint64_t>(large, 40)};
}

/// What a central header says of a member.
struct Entry {
    std::uint16_t flags = 0, method = 0;
    std::uint32_t crc = 0;
    std::uint64_t packed = 0, size = 0, local = 0;
    std::string_view name;
    std::size_t length = 0; ///< of the header itself
};

/// Puts the 64-bit sizes in the place of those that are all ones.
void takeLargeSizes(Entry& entry, std::string_view extra) {
    while (extra.size() >= 4) {
        const std::size_t length = littleAt<std::uint16_t>(extra, 2);
        std::string_view field = extra.substr(4, length);
        if (littleAt<std::uint16_t>(extra, 0) == zip::largeSizesId)
            for (std::uint64_t* number : {&entry.size, &entry.packed, &entry.local})
                if (*number == zip::allOnes && field.size() >= 8) {
                    *number = littleAt<std::uint64_t>(field, 0);
                    field.remove_prefix(8);
                }
        extra.remove_prefix(std::min(extra.size(), 4 + length));
    }
}

Entry entryAt(std::string_view bytes) {
    if (bytes.size() < zip::centralSize)
        refuse("it is damaged: its directory ends within a member");
    requireMark(bytes, zip::centralMark, "directory");
    const std::size_t name = littleAt<std::uint16_t>(bytes, 28);
    const std::size_t extra = littleAt<std::uint16_t>(bytes, 30);
    Entry entry{
        littleAt<std::uint16_t>(bytes, 8),    littleAt<std::uint16_t>(bytes, 10),
        littleAt<std::uint32_t>(bytes, 16),   littleAt<std::uint32_t>(bytes, 20),
        littleAt<std::uint32_t>(bytes, 24),   littleAt<std::uint32_t>(bytes, 42),
        bytes.substr(zip::centralSize, name), zip::centralSize + name + extra + littleAt<std::uint16_t>(bytes, 32)};
    if (entry.length > bytes.size())
        refuse("it is damaged: its directory ends within a member");
    takeLargeSizes(entry, bytes.substr(zip::centralSize + name, extra));
    return entry;
}

/// Those of a directory's members whose name `isWanted`.
template <class IsWanted>
std::vector<Entry> entriesOf(std::string_view directory, IsWanted isWanted) {
    std::vector<Entry> entries;
    while (!directory.empty()) {
        const Entry entry = entryAt(directory);
        directory.remove_prefix(entry.length);
        if (isWanted(entry.name))
            entries.push_back(entry);
    }
    return entries;
}

FileBytes bytesOf(const FileBytes& file, const Entry& entry) {
    const std::string local = wanted(file, entry.local, zip::localSize, "member");
    requireMark(local, zip::localMark, "member");
    const std::uint64_t start = entry.local + zip::localSize + littleAt<std::uint16_t>(local, 26) +
                                littleAt<std::uint16_t>(local, 28); // no overflow: `local` lies in the file
    if (start > file.size || entry.packed > file.size - start)
        refuse("it is cut short: its array is to take " + std::to_string(entry.packed) + " bytes from byte " +
               std::to_string(start) + " on, and it has " + std::to_string(file.size));
    return file.part(start, entry.packed);
}

/// What is at the end: all central headers.
std::string directoryOf(const FileBytes& file) {
    const Directory directory = findDirectory(file);
    constexpr std::uint64_t mostDirectory = 1U << 20U;
    if (directory.size > mostDirectory)
        refuse("its directory takes " + std::to_string(directory.size) + " bytes: at most " +
               std::to_string(mostDirectory) + " are read");
    return wanted(file, directory.start, static_cast<std::size_t>(directory.size), "directory");
}

ZipMember memberOf(const FileBytes& file, const Entry& entry) {
    constexpr std::uint16_t encrypted = 1, stored = 0, deflated = 8;
    if ((entry.flags & encrypted) != 0)
        refuse("its array is encrypted");
    if (entry.method != stored && entry.method != deflated)
        refuse("its array is compressed by method " + std::to_string(entry.method) +
               ": what numpy.savez and numpy.savez_compressed write is read");
    const ZipMember member{entry.method == deflated, entry.crc, entry.size, bytesOf(file, entry)};
    if (!member.isDeflated && member.size != member.bytes.size)
        refuse("it is damaged: its stored array has two sizes, " + std::to_string(member.size) + " and " +
               std::to_string(member.bytes.size) + " bytes");
    return member;
}

} // namespace

ZipMember findOnlyArray(const FileBytes& file) {
    const std::string directory = directoryOf(file);
    const auto arrays = entriesOf(directory, [](std::string_view name) { return name.ends_with(".npy"); });
    if (arrays.size() != 1)
        refuse("it has " + std::to_string(arrays.size()) + " arrays: a point cache is one");
    return memberOf(file, arrays.front());
}

std::optional<ZipMember> findMember(const FileBytes& file, std::string_view name) {
    const std::string directory = directoryOf(file);
    const auto members = entriesOf(directory, [name](std::string_view found) { return found == name; });
    if (members.empty())
        return {};
    if (members.size() > 1)
        refuse("it has " + std::to_string(members.size()) + " members " + std::string(name));
    return memberOf(file, members.front());
}

} // namespace storage
