// SPDX-License-Identifier: Apache-2.0
#include "quarn/scene/goOn.h"

#include "quarn/console/Console.h"
#include "storage/TemporaryFile.h"

#include <algorithm>
#include <optional>
#include <stdexcept>

namespace quarn {
namespace {

std::string countOf(std::size_t rows, const RecordedRows& all) {
    return std::to_string(rows) + " of " + std::to_string(all.allRows());
}

} // namespace

bool belongsToMaking(std::string_view name, std::span<const char* const> files) {
    return name.starts_with(".nfs") || std::any_of(files.begin(), files.end(), [&](const char* file) {
               return name == file || storage::TemporaryFile::isOf(name, file);
           });
}

Begun begunWith(const Setup& setup, const std::filesystem::path& part, bool replaces) {
    if (!std::filesystem::exists(part / setupFile))
        return Begun::no;
    const std::optional<Setup> earlier = Setup::read(part / setupFile);
    if (!earlier)
        return Begun::damaged;
    const std::string difference = setup.differenceFrom(*earlier);
    if (difference.empty())
        return Begun::yes;
    if (replaces)
        return Begun::no;
    throw std::runtime_error(part.string() + " was begun with another set-up (" + difference +
                             "); choose another place with -o, or begin again with --overwrite");
}

bool goOn(RecordedRows& rows, Begun begun, const std::filesystem::path& part, const Console& console) {
    if (begun == Begun::no)
        return false;
    const std::string damage = begun == Begun::damaged ? std::string(setupFile) + " cannot be read" : rows.resume();
    if (damage.empty())
        console.note("going on after " + countOf(rows.rows(), rows) + " rows in " + part.string());
    else
        console.note(part.string() + " cannot be gone on from (" + damage + "): beginning again");
    return damage.empty();
}

bool keepRows(RecordedRows& rows, const std::filesystem::path& part, const Console& console) {
    try {
        rows.save();
    } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): what ended the rows is what the user reads
    }
    if (rows.savedRows() == 0)
        return false;
    console.note(countOf(rows.savedRows(), rows) + " rows are kept in " + part.string() +
                 "; the same command goes on from there");
    return true;
}

} // namespace quarn
