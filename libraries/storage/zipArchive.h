// SPDX-License-Identifier: Apache-2.0
// Archives of NumPy: a ZIP file whose members are arrays, stored or deflated.
//
// Source: the ZIP file format as its public description (APPNOTE 6.3) has it: local header and data of each member, the
// central directory, its end record; with the 64-bit records where a size is above 4 GiB, as numpy writes them.
#pragma once

#include "storage/FileBytes.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace storage {

/// A member of an archive.
struct ZipMember {
    bool isDeflated = false; ///< otherwise stored
    std::uint32_t crc = 0;   ///< of the unpacked bytes
    std::uint64_t size = 0;  ///< unpacked, as the directory says
    FileBytes bytes;         ///< as they lie in the file
};

/// The one member of the archive whose name ends in ".npy". Throws std::runtime_error, with the reason alone, for
/// anything that is no such archive, with none or several of them, and for encrypted members and other methods. [any]
ZipMember findOnlyArray(const FileBytes& file);
/// The member of that name; nothing when there is none. Throws the same, and for two of that name. [any]
std::optional<ZipMember> findMember(const FileBytes& file, std::string_view name);

/// What lies before and behind the bytes of the only member of an archive, which is stored.
struct ZipFrame {
    std::string before, behind;
};
/// Bytes of ZipFrame::before for a member of that name.
std::size_t zipFrameStart(const std::string& name);
/// `crc` and `size` of the member's bytes. [any]
ZipFrame makeZipFrame(const std::string& name, std::uint32_t crc, std::uint64_t size);

} // namespace storage
