// SPDX-License-Identifier: Apache-2.0
#include "quarn/console/ProgressFile.h"

#include "quarn/console/json.h"
#include "storage/FileError.h"
#include "storage/WholeFile.h"

#include <algorithm>

namespace quarn {

ProgressFile::ProgressFile(std::filesystem::path path, std::string what, std::size_t total)
    : path_(std::move(path))
    , what_(std::move(what))
    , total_(total)
    , begin_(Clock::now())
    , written_(begin_) {
    if (!path_.empty())
        write(0);
}

void ProgressFile::count(std::size_t done) {
    constexpr auto apart = std::chrono::milliseconds(500);
    if (path_.empty() || (Clock::now() - written_ < apart && done < total_))
        return;
    try {
        write(done);
    } catch (const storage::FileError&) { // NOLINT(bugprone-empty-catch): whoever looks on sees that it has stopped
    }
    written_ = Clock::now();
}

void ProgressFile::write(std::size_t done) {
    const double seconds = std::chrono::duration<double>(Clock::now() - begin_).count();
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "what", what_);
    writeCount(writer, "done", done);
    writeCount(writer, "total", total_);
    writer.Key("seconds");
    writer.Double(seconds);
    writer.Key("secondsLeft");
    if (done > 0)
        writer.Double(seconds / static_cast<double>(done) * static_cast<double>(total_ - std::min(done, total_)));
    else
        writer.Null();
    writer.EndObject();
    storage::writeWhole(path_, std::string(buffer.GetString()) + "\n");
}

} // namespace quarn
