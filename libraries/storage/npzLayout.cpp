// SPDX-License-Identifier: Apache-2.0
#include "storage/CacheLayout.h"
#include "storage/unpack.h"
#include "storage/zipArchive.h"

namespace storage {

CacheLayout npzLayout(const FileBytes& file) {
    const ZipMember member = findOnlyArray(file);
    if (!member.isDeflated)
        return npyLayout(member.bytes);
    Descriptor unpacked = unpack(member);
    CacheLayout layout = npyLayout({unpacked.number(), 0, member.size});
    layout.unpacked = std::move(unpacked);
    return layout;
}

} // namespace storage
