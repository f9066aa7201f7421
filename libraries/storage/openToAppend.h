// SPDX-License-Identifier: Apache-2.0
#pragma once

#include "storage/Descriptor.h"

#include <filesystem>
#include <string_view>

namespace storage {

/// A file that grows while a program runs, so that what it holds survives the program: what is written goes behind what
/// is there, also when several programs write at the same time. A file that is there and not empty has to begin with
/// `mark`: it is no file of this kind otherwise, and stays as it is. Missing folders are made, links followed, and what
/// is no file is written through or refused as by findTarget(). Throws FileError. Thread: any.
Descriptor openToAppend(const std::filesystem::path& path, std::string_view mark);

} // namespace storage
