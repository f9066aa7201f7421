// SPDX-License-Identifier: Apache-2.0
#include "quarn/run/RunProgress.h"

#include "quarn/console/json.h"
#include "storage/WholeFile.h"

#include <unistd.h>

namespace quarn {

RunProgress::RunProgress(const std::filesystem::path& folder)
    : file_(folder / fileName)
    , begin_(Clock::now()) {}

void RunProgress::begin(const std::string& step, std::size_t number, std::size_t of) {
    step_ = step;
    number_ = number;
    of_ = of;
    begin_ = Clock::now();
}

void RunProgress::count(const StepCounts& counts) noexcept {
    try {
        write(counts);
    } catch (const std::exception&) { // NOLINT(bugprone-empty-catch): whoever looks on sees that it has stopped
    }
}

void RunProgress::end(const char* state, const std::string& error) noexcept {
    try {
        state_ = state;
        error_ = error;
    } catch (const std::bad_alloc&) { // NOLINT(bugprone-empty-catch): the reason is told otherwise as well
    }
    count({});
}

void RunProgress::write(const StepCounts& counts) const {
    rapidjson::StringBuffer buffer;
    JsonWriter writer(buffer);
    writer.StartObject();
    writeText(writer, "format", "quarn run progress");
    writeCount(writer, "version", 1);
    writer.Key("process");
    writer.Int(::getpid());
    writeText(writer, "state", state_);
    writeText(writer, "error", error_);
    writeText(writer, "step", step_);
    writeCount(writer, "number", number_);
    writeCount(writer, "of", of_);
    writer.Key("stepSeconds");
    writer.Double(std::chrono::duration<double>(Clock::now() - begin_).count());
    writeText(writer, "what", counts.what);
    writeCount(writer, "done", counts.done);
    writeCount(writer, "total", counts.total);
    writer.Key("secondsLeft");
    if (counts.secondsLeft)
        writer.Double(*counts.secondsLeft);
    else
        writer.Null();
    writer.EndObject();
    storage::writeWhole(file_, std::string(buffer.GetString()) + "\n");
}

} // namespace quarn
