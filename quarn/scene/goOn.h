// SPDX-License-Identifier: Apache-2.0
// Going on with rows that an earlier run has left in a folder.
#pragma once

#include "quarn/scene/RecordedRows.h"
#include "quarn/scene/Setup.h"

#include <filesystem>
#include <span>
#include <string_view>

namespace quarn {

struct Console;

/// Whether a file of this name belongs to the making of `files`: it is one of them, or what a writer of one has left,
/// or what NFS keeps of one that was removed while it was open, and takes away itself. Thread: any.
bool belongsToMaking(std::string_view name, std::span<const char* const> files);

enum class Begun { no, yes, damaged };

/// Whether the rows in `part` were begun with this set-up, which setup.json there says. Throws std::runtime_error, with
/// the first difference, when they were begun with another, unless that is to be replaced. Thread: any.
Begun begunWith(const Setup& setup, const std::filesystem::path& part, bool replaces);

/// Takes up what is there, and says so in a note; and why not, where it cannot be taken up. False: the rows are to be
/// begun. Thread: one at a time.
bool goOn(RecordedRows& rows, Begun begun, const std::filesystem::path& part, const Console& console);

/// After an error, or Ctrl-C: records the rows that there are, and says so. False where there is none, and nothing that
/// would be worth going on from. Throws nothing: what ended the rows is what the user reads. Thread: one at a time.
bool keepRows(RecordedRows& rows, const std::filesystem::path& part, const Console& console);

} // namespace quarn
