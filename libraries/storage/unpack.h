// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/Descriptor.h"
#include "storage/zipArchive.h"

#include <cstdint>

namespace storage {

/// A member that says it is larger is refused: a deflated byte can be a thousand.
inline constexpr std::uint64_t unpackedLimit = 4'000'000'000;

/// An empty file without a name in the folder for temporary files, gone with its descriptor. Throws std::runtime_error,
/// with the reason alone. [any]
Descriptor unnamedFile();

/// An unnamedFile() with the bytes of a deflated member; member.size of them.
/// Throws std::runtime_error, with the reason alone, when they are more or fewer, or their sum is another. [any]
Descriptor unpack(const ZipMember& member);

} // namespace storage
