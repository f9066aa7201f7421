// SPDX-License-Identifier: Apache-2.0
#include "storage/fileSum.h"

#include "storage/ByteSum.h"
#include "storage/openToRead.h"

#include <algorithm>
#include <cerrno>
#include <span>
#include <vector>

namespace storage {

FileSum sumOfFile(const std::filesystem::path& path, std::uint64_t most, std::size_t headSize) {
    constexpr std::size_t blockSize = 1U << 18U; // stays in the second cache between reading and adding
    const OpenFile file = openToRead(path, most);
    ByteSum bytes;
    std::vector<std::byte> block(std::max<std::size_t>(std::min<std::uint64_t>(blockSize, file.size + 1), headSize));
    FileSum sum;
    for (std::uint64_t done = 0;;) {
        const std::ptrdiff_t got = readAt(file.descriptor.number(), done, block);
        if (got < 0)
            failToRead(path, errno);
        const auto size = static_cast<std::size_t>(got);
        if (done == 0)
            sum.head.assign(reinterpret_cast<const char*>(block.data()), std::min(size, headSize));
        bytes.add(std::span(block).first(size));
        done += size;
        if (done > most)
            refuseSize(path, "more than " + std::to_string(most), most);
        if (size < block.size())
            break;
    }
    sum.digits = bytes.digits();
    return sum;
}

} // namespace storage
