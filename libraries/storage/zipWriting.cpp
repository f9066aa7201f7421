// SPDX-License-Identifier: Apache-2.0
#include "storage/byteOrder.h"
#include "storage/zipArchive.h"
#include "storage/zipRecords.h"

namespace storage {
namespace {

constexpr std::uint16_t largeFieldSize = 4 + 2 * sizeof(std::uint64_t); // of the sizes alone
constexpr std::uint16_t noTime = 0, firstDate = 0x21; // 1980-01-01: the same bytes for the same points

// from the version on, what the headers of both kinds have
void putMember(std::string& bytes, const std::string& name, std::uint32_t crc, std::uint16_t extra) {
    putLittle(bytes, zip::largeSizesVersion);
    putLittle<std::uint16_t>(bytes, 0); // flags
    putLittle<std::uint16_t>(bytes, 0); // stored
    putLittle(bytes, noTime);
    putLittle(bytes, firstDate);
    putLittle(bytes, crc);
    putLittle(bytes, zip::allOnes); // both sizes: in the extra field
    putLittle(bytes, zip::allOnes);
    putLittle(bytes, static_cast<std::uint16_t>(name.size()));
    putLittle(bytes, extra);
}

void putLargeSizes(std::string& bytes, std::uint64_t size) {
    putLittle(bytes, zip::largeSizesId);
    putLittle<std::uint16_t>(bytes, largeFieldSize - 4);
    putLittle(bytes, size);
    putLittle(bytes, size);
}

std::string directoryOf(const std::string& name, std::uint32_t crc, std::uint64_t size) {
    std::string bytes;
    putLittle(bytes, zip::centralMark);
    putLittle(bytes, zip::largeSizesVersion); // made by
    putMember(bytes, name, crc, largeFieldSize);
    bytes.append(2 + 2 + 2 + 4 + 4, '\0'); // no comment, disk 0, no attributes, at byte 0
    bytes += name;
    putLargeSizes(bytes, size);
    return bytes;
}

// the 64-bit end record, its locator and the end record: a directory of one member at `start`
void putEnd(std::string& bytes, std::uint64_t start, std::uint64_t directorySize) {
    const std::uint64_t end = start + directorySize;
    putLittle(bytes, zip::largeEndMark);
    putLittle<std::uint64_t>(bytes, zip::largeEndSize - 12);
    putLittle(bytes, zip::largeSizesVersion);
    putLittle(bytes, zip::largeSizesVersion);
    bytes.append(4 + 4, '\0'); // disks
    for (const std::uint64_t number : {std::uint64_t{1}, std::uint64_t{1}, directorySize, start})
        putLittle(bytes, number);
    putLittle(bytes, zip::locatorMark);
    putLittle<std::uint32_t>(bytes, 0);
    putLittle(bytes, end);
    putLittle<std::uint32_t>(bytes, 1);
    putLittle(bytes, zip::endMark);
    bytes.append(2 + 2, '\0');
    putLittle<std::uint16_t>(bytes, 1);
    putLittle<std::uint16_t>(bytes, 1);
    putLittle(bytes, static_cast<std::uint32_t>(directorySize));
    putLittle(bytes, zip::allOnes); // where it is: in the 64-bit record
    putLittle<std::uint16_t>(bytes, 0);
}

} // namespace

std::size_t zipFrameStart(const std::string& name) {
    return zip::localSize + name.size() + largeFieldSize;
}

ZipFrame makeZipFrame(const std::string& name, std::uint32_t crc, std::uint64_t size) {
    ZipFrame frame;
    putLittle(frame.before, zip::localMark);
    putMember(frame.before, name, crc, largeFieldSize);
    frame.before += name;
    putLargeSizes(frame.before, size);
    frame.behind = directoryOf(name, crc, size);
    putEnd(frame.behind, frame.before.size() + size, frame.behind.size());
    return frame;
}

} // namespace storage
