// SPDX-License-Identifier: Apache-2.0
#include "storage/readWholeFile.h"

#include "storage/openToRead.h"

#include <algorithm>
#include <cerrno>
#include <span>

namespace storage {

std::string readWholeFile(const std::filesystem::path& path, std::uint64_t most) {
    const OpenFile file = openToRead(path, most);
    // one more than there are to be: files of the system have no size, and others grow
    std::string bytes(file.size + 1, '\0');
    std::size_t done = 0;
    for (;;) {
        const std::ptrdiff_t got =
            readAt(file.descriptor.number(), done, std::as_writable_bytes(std::span(bytes)).subspan(done));
        if (got < 0)
            failToRead(path, errno);
        done += static_cast<std::size_t>(got);
        if (done > most)
            refuseSize(path, "more than " + std::to_string(most), most);
        if (done < bytes.size())
            break;
        bytes.resize(std::min<std::uint64_t>(2 * bytes.size() + 4096, most + 1));
    }
    bytes.resize(done);
    return bytes;
}

} // namespace storage
